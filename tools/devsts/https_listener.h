// SPDX-License-Identifier: Apache-2.0
/// @file
/// The HTTPS server: listens on both loopback addresses and runs the connections.

#pragma once

#include <cstdint>
#include <memory>

namespace DevSts {

struct Identity;
class RequestHandler;

class HttpsListener {
public:
  /// Listens on 127.0.0.1 and, where the machine has it, on ::1; port 0 takes a free one, the same for both.
  /// `handler` outlives the listener. @throws std::exception when that is not possible
  HttpsListener(const Identity &identity, std::uint16_t port, const RequestHandler &handler);
  HttpsListener(const HttpsListener &) = delete;
  HttpsListener &operator=(const HttpsListener &) = delete;
  /// Ends all connections at once.
  ~HttpsListener();

  std::uint16_t GetPort() const noexcept;

  /// Starts to take connections, on threads of its own.
  void Start();

private:
  class Server; // where Asio is, which takes seconds to compile
  const std::unique_ptr<Server> m_server;
};

} // namespace DevSts
