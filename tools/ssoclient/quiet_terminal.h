// SPDX-License-Identifier: Apache-2.0
/// @file
/// `QuietTerminal`, a terminal that does not echo what is typed.

#pragma once

#include <csignal>

namespace SsoClient::Tool {

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

/// Makes a quiet terminal echo again, and prevents any terminal from becoming quiet afterwards. For the end of the
/// process; may be called once, on any thread.
void RestoreTerminal() noexcept;

} // namespace SsoClient::Tool
