// SPDX-License-Identifier: Apache-2.0
/// @file
/// Running the tool as a process.

#pragma once

#include "support/data_file.h"

#include <string>
#include <vector>

#include <sys/types.h>

namespace ToolTest {

struct Result {
  int exitCode = -1; ///< 128 plus the signal when one ended the process
  std::string out;
  std::string err;
};

/// Resets signals to what they do in a shell's foreground. Called in a new process before it executes another program,
/// since a program inherits which signals its parent ignores: a shell ignores some for background jobs.
void ResetSignals();

/// Whether the main thread of process `id` blocks `signal`, so that another thread receives it.
bool Blocks(pid_t id, int signal);

/// The words that start the tool with `arguments`.
std::vector<std::string> ToolCommand(const std::vector<std::string> &arguments);

/// The words that have a shell run `commandLine` with "ssoclient" in the search path.
std::vector<std::string> ShellCommand(const std::string &commandLine);

/// Runs the tool with `arguments`, in tests/data/tokens, with `input` as its standard input, to its end.
Result RunTool(const std::vector<std::string> &arguments, const std::string &input = {});

/// Runs `ShellCommand(commandLine)` in `folder`.
Result RunShell(const std::string &commandLine, const std::string &folder = Testing::DataPath("tokens"));

/// Starts the tool with a standard input that stays open and silent, sends it `signal` as soon as the tool waits for
/// that signal, and returns how the tool ended.
Result RunToolAndSignal(const std::vector<std::string> &arguments, int signal);

} // namespace ToolTest
