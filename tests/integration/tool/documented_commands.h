// SPDX-License-Identifier: Apache-2.0
/// @file
/// The command lines in the help, the manual and the pages, and a fixture that runs them.

#pragma once

#include "service_test.h"

#include <string>
#include <vector>

namespace ToolTest {

/// The examples in the help of `command`, each with its continuation lines.
std::vector<std::string> ExamplesOfHelp(const std::string &command);
/// Those in the manual.
std::vector<std::string> ExamplesOfManual();
/// Those of a Markdown page such as "README.md": the lines of its shell blocks that begin with the name of the tool.
std::vector<std::string> ExamplesOfPage(const std::string &page);

/// Whether an example needs a Kerberos realm.
bool IsForTickets(const std::string &example);

class DocumentedCommands : public ServiceTest {
protected:
  explicit DocumentedCommands(const std::vector<std::string> &serviceArguments = {});

  /// Expects one example to succeed, with the running service in place of the example's. Types the password when it is
  /// prompted for.
  void ExpectToRun(const std::string &example) const;
};

} // namespace ToolTest
