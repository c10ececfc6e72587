// SPDX-License-Identifier: Apache-2.0
// Each command line that the help, the manual and the README show does what a reader expects: it runs. Those that need a
// Kerberos realm run in another test, which has one.

#include "documented_commands.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace ToolTest {
namespace {

class Documented : public DocumentedCommands {
protected:
  void RunUnlessForTickets(const std::string &example) const {
    if (!IsForTickets(example)) {
      ExpectToRun(example);
    }
  }
};

TEST_F(Documented, OfTheHelpRun) {
  Acquire("token.xml", PASSWORD);
  for (const char *command : {"acquire", "renew", "validate", "verify", "inspect"}) {
    const std::vector<std::string> examples = ExamplesOfHelp(command);
    EXPECT_FALSE(examples.empty()) << command;
    for (const std::string &example : examples) {
      EXPECT_EQ(0u, example.find(std::string("  ssoclient ") + command + " ")) << example;
      RunUnlessForTickets(example);
    }
  }
}

TEST_F(Documented, OfTheManualRun) {
  Acquire("token.xml", PASSWORD);
  const std::vector<std::string> examples = ExamplesOfManual();
  EXPECT_FALSE(examples.empty());
  for (const std::string &example : examples) {
    EXPECT_NE(std::string::npos, example.find("ssoclient ")) << example;
    RunUnlessForTickets(example);
  }
}

TEST_F(Documented, OfTheReadmeRun) {
  const std::vector<std::string> examples = ExamplesOfPage("README.md");
  EXPECT_FALSE(examples.empty());
  for (const std::string &example : examples) {
    RunUnlessForTickets(example);
  }
}

} // namespace
} // namespace ToolTest
