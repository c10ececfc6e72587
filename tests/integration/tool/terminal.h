// SPDX-License-Identifier: Apache-2.0
/// @file
/// Running a command at a terminal of its own.

#pragma once

#include <string>
#include <vector>

#include <sys/types.h>

namespace ToolTest {

/// A command at a new pseudo-terminal, which is its standard input, output and error, and its controlling terminal.
/// Every wait throws an exception after half a minute.
class TerminalSession {
public:
  /// Starts the program `words[0]` in `folder`.
  TerminalSession(std::vector<std::string> words, const std::string &folder);
  TerminalSession(const TerminalSession &) = delete;
  TerminalSession &operator=(const TerminalSession &) = delete;
  ~TerminalSession();

  /// Reads until the terminal shows `text`.
  void WaitFor(const std::string &text);
  void Type(const std::string &text);
  /// Whether the terminal echoes what is typed.
  bool Echoes() const;

  void Signal(int signal);
  /// Waits until the main thread of the process blocks `signal`, so that another thread receives it.
  void WaitUntilItBlocks(int signal) const;
  /// Reads the rest of the output. Returns the exit code, or 128 plus the signal that ended the process.
  int Finish();

  /// All that the terminal has shown so far, its line ends as CR LF.
  const std::string &Shown() const { return m_shown; }

private:
  bool ReadSome(int timeoutMs);

  int m_master = -1;
  int m_slave = -1; ///< kept open, so that the settings can be read after the process has ended
  pid_t m_process = -1;
  std::string m_shown;
};

} // namespace ToolTest
