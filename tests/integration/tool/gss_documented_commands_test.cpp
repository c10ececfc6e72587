// SPDX-License-Identifier: Apache-2.0
// Each command line of the help, the manual and the README that needs a Kerberos realm runs in one.

#include "documented_commands.h"
#include "ticket_world.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

namespace ToolTest {
namespace {

class DocumentedForTickets : protected TicketWorld, public DocumentedCommands {
protected:
  DocumentedForTickets() : DocumentedCommands(ServiceArguments()) {
    LogIn();
    std::filesystem::copy_file(PathOf(m_aliceKeytab), m_folder / "robot.keytab");
  }

  /// @return how many there are
  int RunThose(const std::vector<std::string> &examples) const {
    int count = 0;
    for (const std::string &example : examples) {
      if (IsForTickets(example)) {
        ExpectToRun(example);
        ++count;
      }
    }
    return count;
  }
};

TEST_F(DocumentedForTickets, OfTheHelpRun) {
  EXPECT_EQ(2, RunThose(ExamplesOfHelp("acquire")));
}

TEST_F(DocumentedForTickets, OfTheManualRun) {
  EXPECT_EQ(2, RunThose(ExamplesOfManual()));
}

} // namespace
} // namespace ToolTest
