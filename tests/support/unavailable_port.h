// SPDX-License-Identifier: Apache-2.0
/// @file
/// Ports of loopback to which a client cannot connect: `UnusedPort` and `FullPort`.

#pragma once

#include "support/loopback_socket.h"

#include <string_view>
#include <vector>

namespace Testing {

/// A port of 127.0.0.1, 127.0.0.2 and ::1 on which no process listens: connecting is refused as long as this object
/// exists.
class UnusedPort {
public:
  UnusedPort();
  int GetPort() const noexcept { return m_port.GetNumber(); }

private:
  const LoopbackPort m_port;
};

/// A port of 127.0.0.1 that accepts no more connections: its queue stays full. A connect gets no answer. At 127.0.0.2
/// and ::1 it is refused.
class FullPort {
public:
  FullPort();
  FullPort(const FullPort &) = delete;
  FullPort &operator=(const FullPort &) = delete;
  ~FullPort();
  int GetPort() const noexcept { return m_port.GetNumber(); }

  /// Empties the queue. Later connections get an answer from `AnswerAll`.
  void Empty();
  /// Answers one request of each connection, until another thread calls `StopAnswering`.
  void AnswerAll(std::string_view bytes);
  void StopAnswering();

private:
  const LoopbackPort m_port;
  const int m_listener = m_port.GetSocket();
  std::vector<int> m_fillers;
};

} // namespace Testing
