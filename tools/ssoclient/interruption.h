// SPDX-License-Identifier: Apache-2.0
/// @file
/// How the tool ends when it is told to: at once, with the terminal as it was and nothing half done left behind.

#pragma once

#include <csignal>

#include <termios.h>

namespace SsoClient::Tool {

/// From now on an interrupt (SIGINT) ends the process with `ExitCode::INTERRUPTED`, and SIGTERM, SIGHUP and SIGQUIT end it
/// as they always do; before either, a terminal that was made quiet echoes again. A signal that is ignored stays so. To be
/// called on the main thread, which stays the only one that takes signals: the library's own threads hold them all back.
void CatchEndingSignals();

/// Holds back, while it lives, the signals that end or stop the process; one that comes meanwhile takes effect afterwards.
/// For work that is short and must not stay half done. Main thread only.
class SignalsHeldBack {
public:
  SignalsHeldBack() noexcept;
  SignalsHeldBack(const SignalsHeldBack &) = delete;
  SignalsHeldBack &operator=(const SignalsHeldBack &) = delete;
  ~SignalsHeldBack();

private:
  sigset_t m_earlier;
};

/// Keeps the terminal at a descriptor, if it is one, from echoing what is typed; the end of the line still shows. The
/// process cannot be stopped by the keyboard meanwhile, since the shell would make the terminal echo again. At most one at
/// a time; main thread only.
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
