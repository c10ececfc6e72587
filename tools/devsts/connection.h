// SPDX-License-Identifier: Apache-2.0
/// @file
/// One TLS connection: reads requests, has them handled, delivers the answers.

#pragma once

#include "delivery.h"
#include "request_handler.h"

#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/core/tcp_stream.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>
#include <boost/beast/ssl/ssl_stream.hpp>

#include <atomic>
#include <memory>
#include <optional>
#include <string>

namespace DevSts {

/// Lives as long as an operation of it is under way. Everything runs on the strand of its socket.
class Connection : public std::enable_shared_from_this<Connection> {
public:
  /// All references outlive the connection. `count` is one higher while it lives.
  Connection(boost::asio::ip::tcp::socket socket, boost::asio::ssl::context &tls, const RequestHandler &handler,
             std::atomic<int> &count);
  Connection(const Connection &) = delete;
  Connection &operator=(const Connection &) = delete;
  ~Connection();

  void Start();

private:
  using ErrorCode = boost::beast::error_code;

  void Read();
  void OnRead(const ErrorCode &error);
  void RefuseUnreadable(const ErrorCode &error);
  void Begin(Delivery delivery);
  void NextStep();
  void WriteStep();
  void Finish();
  void Close();
  void Linger();
  void Reset();
  void AwaitPeer();
  HttpRequest TakeRequest();

  boost::beast::ssl_stream<boost::beast::tcp_stream> m_stream;
  boost::asio::steady_timer m_timer;
  const RequestHandler &m_handler;
  std::atomic<int> &m_count;
  std::string m_peer;
  boost::beast::flat_buffer m_buffer;
  std::optional<boost::beast::http::request_parser<boost::beast::http::string_body>> m_parser;
  Delivery m_delivery;
  std::size_t m_step = 0;
};

} // namespace DevSts
