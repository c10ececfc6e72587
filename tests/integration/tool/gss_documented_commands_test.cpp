// SPDX-License-Identifier: Apache-2.0
// Runs each command line in the help, the manual and the pages that needs a Kerberos realm.

#include "documented_commands.h"
#include "ticket_world.h"

#include <gtest/gtest.h>

#include <cstdlib>
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
    std::filesystem::create_directory(m_folder / "sts");
    for (const char *file : {"authority.crt", "signing.crt"}) {
      std::filesystem::copy_file(m_service.PathOf(file), m_folder / "sts/" + file);
    }
    setenv("KERBEROS_FOLDER", m_realm.GetFolder().c_str(), 1);
  }

  ~DocumentedForTickets() override { unsetenv("KERBEROS_FOLDER"); }

  /// Runs the examples that need a realm. @return their number
  int RunExamplesForTickets(const std::vector<std::string> &examples) const {
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
  EXPECT_EQ(2, RunExamplesForTickets(ExamplesOfHelp("acquire")));
}

TEST_F(DocumentedForTickets, OfTheManualRun) {
  EXPECT_EQ(2, RunExamplesForTickets(ExamplesOfManual()));
}

TEST_F(DocumentedForTickets, OfThePageOnTicketsRun) {
  EXPECT_EQ(4, RunExamplesForTickets(ExamplesOfPage("docs/gssapi.md")));
}

TEST_F(DocumentedForTickets, OfTheReadmeRun) {
  EXPECT_EQ(1, RunExamplesForTickets(ExamplesOfPage("README.md")));
}

} // namespace
} // namespace ToolTest
