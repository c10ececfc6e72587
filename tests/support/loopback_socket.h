// SPDX-License-Identifier: Apache-2.0
/// @file
/// TCP sockets on free ports of loopback: `BindLoopback` and `LoopbackPort`.

#pragma once

#include <vector>

namespace Testing {

/// Returns a socket that is bound to a free port of 127.0.0.1, or with `v6` of ::1, and sets `port` to that port. The
/// caller closes the socket. @throws std::runtime_error
int BindLoopback(bool v6, int &port);

/// A port of 127.0.0.1, or of ::1, whose number no other program can use at 127.0.0.1, 127.0.0.2 or ::1 as long as this
/// object exists. So a client of "localhost" cannot reach a stranger, and connecting to the other two addresses is
/// refused.
class LoopbackPort {
public:
  /// @throws std::runtime_error
  explicit LoopbackPort(bool v6 = false);
  LoopbackPort(const LoopbackPort &) = delete;
  LoopbackPort &operator=(const LoopbackPort &) = delete;
  ~LoopbackPort();

  int GetNumber() const noexcept { return m_number; }
  /// A socket that is bound to the port. Until it listens, connecting is refused.
  int GetSocket() const noexcept { return m_sockets.front(); }

private:
  bool ReserveAtOtherAddresses(bool v6);
  void CloseAll() noexcept;

  int m_number = 0;
  std::vector<int> m_sockets; // bound; those after the first never listen
};

} // namespace Testing
