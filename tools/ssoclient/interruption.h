// SPDX-License-Identifier: Apache-2.0
/// @file
/// How a signal ends the tool: at once, with the terminal restored, and with no unfinished file left over.

#pragma once

#include <csignal>

#include <termios.h>

namespace SsoClient::Tool {

/// From now on an interrupt (SIGINT) ends the process with `ExitCode::INTERRUPTED`, and SIGTERM, SIGHUP and SIGQUIT end
/// it as they always do; in each case a quiet terminal echoes again first. A signal that is ignored stays ignored. Call
/// it on the main thread, which handles all signals: the library's own threads block them.
void CatchEndingSignals();

/// While it lives, the signals that end or stop the process are blocked; a signal that arrives takes effect afterwards.
/// It is for short work that must not be left half done, on the main thread only.
class SignalsHeldBack {
public:
  SignalsHeldBack() noexcept;
  SignalsHeldBack(const SignalsHeldBack &) = delete;
  SignalsHeldBack &operator=(const SignalsHeldBack &) = delete;
  ~SignalsHeldBack();

private:
  sigset_t m_earlier;
};

/// While it lives, the terminal at a descriptor (if it is a terminal) does not echo what is typed, except the end of
/// the line. The keyboard cannot stop the process, since the shell would then make the terminal echo again. There is
/// at most one at a time, on the main thread only.
class QuietTerminal {
public:
  explicit QuietTerminal(int descriptor) noexcept;
  QuietTerminal(const QuietTerminal &) = delete;
  QuietTerminal &operator=(const QuietTerminal &) = delete;
  ~QuietTerminal();

  bool IsTerminal() const noexcept { return m_isTerminal; }

private:
  bool m_isTerminal;
  sigset_t m_earlierMask;
};

} // namespace SsoClient::Tool
