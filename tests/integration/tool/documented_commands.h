// SPDX-License-Identifier: Apache-2.0
/// @file
/// The command lines in the help, the manual and the pages, and a fixture that runs them.

#pragma once

#include "service_test.h"

#include <string>
#include <vector>

namespace ToolTest {

/// Each with its continuation lines.
std::vector<std::string> ExamplesOfHelp(const std::string &command);
std::vector<std::string> ExamplesOfManual();
/// Of a Markdown page such as "README.md": the lines of the shell blocks that begin with the tool.
std::vector<std::string> ExamplesOfPage(const std::string &page);

/// Whether an example needs a Kerberos realm.
bool IsForTickets(const std::string &example);

class DocumentedCommands : public ServiceTest {
protected:
  explicit DocumentedCommands(const std::vector<std::string> &serviceArguments = {});

  /// Runs one example with the running service in place of the example's. Types the password when it is prompted for.
  void ExpectToRun(const std::string &example) const;
};

} // namespace ToolTest
