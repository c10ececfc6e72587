// SPDX-License-Identifier: Apache-2.0
// Runs each command line in the help, the manual and the README. Another test runs those that need a Kerberos realm.

#include "documented_commands.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace ToolTest {
namespace {

class DocumentedExamples : public DocumentedCommands {
protected:
  void RunUnlessForTickets(const std::string &example) const {
    if (!IsForTickets(example)) {
      ExpectToRun(example);
      // The tokens of other services have the form of the profile saml2 only, which the development service cannot show.
      EXPECT_TRUE(example.find("--dialect ") == std::string::npos ||
                  example.find("--profile saml2") != std::string::npos)
          << example;
    }
  }
};

TEST_F(DocumentedExamples, OfTheHelpRun) {
  Acquire("token.xml", PASSWORD);
  for (const char *command :
       {"acquire", "token", "renew", "validate", "verify", "inspect", "sign", "check-message", "dialect"}) {
    const std::vector<std::string> examples = ExamplesOfHelp(command);
    EXPECT_FALSE(examples.empty()) << command;
    for (const std::string &example : examples) {
      EXPECT_EQ(0u, example.find(std::string("  ssoclient ") + command + " ")) << example;
      RunUnlessForTickets(example);
    }
  }
}

TEST_F(DocumentedExamples, OfTheManualRun) {
  Acquire("token.xml", PASSWORD);
  const std::vector<std::string> examples = ExamplesOfManual();
  EXPECT_FALSE(examples.empty());
  for (const std::string &example : examples) {
    EXPECT_NE(std::string::npos, example.find("ssoclient ")) << example;
    RunUnlessForTickets(example);
  }
}

TEST_F(DocumentedExamples, OfTheReadmeRun) {
  const std::vector<std::string> examples = ExamplesOfPage("README.md");
  EXPECT_FALSE(examples.empty());
  for (const std::string &example : examples) {
    RunUnlessForTickets(example);
  }
}

} // namespace
} // namespace ToolTest
