// SPDX-License-Identifier: Apache-2.0
/// @file
/// The command lines that the help, the manual and the pages show, and a place where they can run.

#pragma once

#include "service_test.h"

#include <string>
#include <vector>

namespace ToolTest {

/// Each with its continuation lines.
std::vector<std::string> ExamplesOfHelp(const std::string &command);
std::vector<std::string> ExamplesOfManual();
/// Of a page in Markdown, as "README.md": the lines of the shell blocks that begin with the tool.
std::vector<std::string> ExamplesOfPage(const std::string &page);

/// Whether an example needs a Kerberos realm.
bool IsForTickets(const std::string &example);

class DocumentedCommands : public ServiceTest {
protected:
  explicit DocumentedCommands(const std::vector<std::string> &serviceArguments = {});

  /// Runs one example, whose service is the one that is running; where it asks for the password, types it.
  void ExpectToRun(const std::string &example) const;
};

} // namespace ToolTest
