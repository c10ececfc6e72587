// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HeldServer`, a server in a process of its own that answers many requests at once, when the test allows it or after
/// a delay.

#pragma once

#include <chrono>
#include <string>
#include <sys/types.h>

namespace Testing {

struct HeldServerState;

/// Always sends the same answer. One thread of a child process serves all connections, so the memory and the threads of
/// the calling process are only those of the client. The child uses only sockets and OpenSSL.
class HeldServer {
public:
  enum class Kind { HTTP, TLS, TLS_WITHOUT_SESSIONS };

  /// At first, the server answers at once.
  /// @param body the body of the answer, of the type text/xml
  /// @throws std::runtime_error
  HeldServer(const std::string &body, Kind kind);
  HeldServer(const HeldServer &) = delete;
  HeldServer &operator=(const HeldServer &) = delete;
  /// Ends the child process.
  ~HeldServer();

  /// For example "https://localhost:4433/sts".
  const std::string &GetUrl() const noexcept { return m_url; }

  /// From now on no request is answered before `Release`.
  void Hold() noexcept;
  void Release() noexcept;
  /// From now on each request is answered after `delay`.
  void DelayAnswers(std::chrono::milliseconds delay) noexcept;

  /// How many requests have arrived so far.
  int CountRequests() const noexcept;
  /// How many connections are open.
  int CountConnections() const noexcept;

private:
  HeldServerState *m_state; // in memory that both processes share
  pid_t m_process = -1;
  std::string m_url;
};

/// Allows this process and its children as many descriptors as the system permits. @return whether that is at least
/// `count`.
bool AllowDescriptors(unsigned long count) noexcept;

} // namespace Testing
