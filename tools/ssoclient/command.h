// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Command`, one row of the tool's table of commands.

#pragma once

#include "exit_code.h"
#include "output.h"

#include <functional>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

/// What a command does once its command line is read. Failures leave it as exceptions; the exit code that it returns is
/// its answer.
using Action = std::function<ExitCode()>;

struct Command {
  const char *name;
  const char *summary;
  const char *examples; ///< command lines, one a line, for the end of the help

  /// Adds the command's own options to `app`; the action reads what they hold. `output` outlives both.
  Action (*define)(CLI::App &app, const OutputOptions &output);
};

Action DefineAcquire(CLI::App &app, const OutputOptions &output);
Action DefineRenew(CLI::App &app, const OutputOptions &output);
Action DefineValidate(CLI::App &app, const OutputOptions &output);
Action DefineVerify(CLI::App &app, const OutputOptions &output);
Action DefineInspect(CLI::App &app, const OutputOptions &output);

} // namespace SsoClient::Tool
