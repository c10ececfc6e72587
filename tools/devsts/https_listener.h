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
  /// Listens on 127.0.0.1 and, where the machine has it, on ::1. Port 0 chooses a free port, the same for both
  /// addresses. `handler` outlives the listener. @throws std::exception when that is not possible
  /// @param asksForCertificates of clients, which need not have one. A certificate of any issuer is accepted, so it
  /// proves its key and nothing else.
  HttpsListener(const Identity &identity, std::uint16_t port, bool asksForCertificates, const RequestHandler &handler);
  HttpsListener(const HttpsListener &) = delete;
  HttpsListener &operator=(const HttpsListener &) = delete;
  /// Closes all connections at once.
  ~HttpsListener();

  std::uint16_t GetPort() const noexcept;

  /// Starts to accept connections, on its own threads.
  void Start();

private:
  class Server; // keeps Asio, which takes seconds to compile, out of this header
  const std::unique_ptr<Server> m_server;
};

} // namespace DevSts
