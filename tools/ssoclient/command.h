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

/// Runs a command whose command line has been read. Returns the exit code; a failure is an exception.
using Action = std::function<ExitCode()>;

struct Command {
  const char *name;
  const char *summary;
  const char *examples; ///< command lines, shown at the end of the help

  Format format; ///< the format without --format

  /// Adds the command's own options to `app`, and returns the action, which uses their values. `output` outlives both.
  Action (*define)(CLI::App &app, const OutputOptions &output);
};

Action DefineAcquire(CLI::App &app, const OutputOptions &output);
Action DefineToken(CLI::App &app, const OutputOptions &output);
Action DefineRenew(CLI::App &app, const OutputOptions &output);
Action DefineValidate(CLI::App &app, const OutputOptions &output);
Action DefineVerify(CLI::App &app, const OutputOptions &output);
Action DefineInspect(CLI::App &app, const OutputOptions &output);
Action DefineSign(CLI::App &app, const OutputOptions &output);
Action DefineCheckMessage(CLI::App &app, const OutputOptions &output);
Action DefineDoctor(CLI::App &app, const OutputOptions &output);
Action DefineDialect(CLI::App &app, const OutputOptions &output);

} // namespace SsoClient::Tool
