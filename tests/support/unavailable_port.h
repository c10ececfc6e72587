// SPDX-License-Identifier: Apache-2.0
/// @file
/// Ports of loopback to which a client cannot connect: `UnusedPort` and `FullPort`.

#pragma once

#include <string_view>
#include <vector>

namespace Testing {

/// A port of 127.0.0.1 on which no process listens: connecting is refused as long as this object exists.
class UnusedPort {
public:
  UnusedPort();
  UnusedPort(const UnusedPort &) = delete;
  UnusedPort &operator=(const UnusedPort &) = delete;
  ~UnusedPort();
  int GetPort() const noexcept { return m_port; }

private:
  int m_port = 0;        // before the descriptor, which sets it
  int m_descriptor = -1; // bound, so that no other process can use the port, but not listening
};

/// A port of 127.0.0.1 that accepts no more connections: its queue stays full. A connect gets no answer.
class FullPort {
public:
  FullPort();
  FullPort(const FullPort &) = delete;
  FullPort &operator=(const FullPort &) = delete;
  ~FullPort();
  int GetPort() const noexcept { return m_port; }

  /// Empties the queue. Later connections get an answer from `AnswerAll`.
  void Empty();
  /// Answers one request of each connection, until another thread calls `StopAnswering`.
  void AnswerAll(std::string_view bytes);
  void StopAnswering();

private:
  int m_port = 0; // before the listener, which sets it
  int m_listener = -1;
  std::vector<int> m_fillers;
};

} // namespace Testing
