// SPDX-License-Identifier: Apache-2.0
/// @file
/// The HTTPS server: listens on both loopback addresses and runs the connections.

#pragma once

#include "request_handler.h"
#include "state_folder.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ssl/context.hpp>

#include <atomic>
#include <cstdint>
#include <deque>
#include <thread>
#include <vector>

namespace DevSts {

class HttpsListener {
public:
  /// Listens on 127.0.0.1 and, where the machine has it, on ::1; port 0 takes a free one, the same for both.
  /// `handler` outlives the listener. @throws std::exception when that is not possible
  HttpsListener(const Identity &identity, std::uint16_t port, const RequestHandler &handler);
  HttpsListener(const HttpsListener &) = delete;
  HttpsListener &operator=(const HttpsListener &) = delete;
  /// Ends all connections at once.
  ~HttpsListener();

  std::uint16_t GetPort() const noexcept { return m_port; }

  /// Starts to take connections, on threads of its own.
  void Start();

private:
  using Acceptor = boost::asio::ip::tcp::acceptor;

  void Listen(std::uint16_t port);
  void Accept(Acceptor &acceptor);

  std::atomic<int> m_connections{0};
  boost::asio::ssl::context m_tls;
  boost::asio::io_context m_context;
  std::deque<Acceptor> m_acceptors;
  const RequestHandler &m_handler;
  std::uint16_t m_port = 0;
  std::vector<std::thread> m_threads;
};

} // namespace DevSts
