// SPDX-License-Identifier: Apache-2.0

#include "http_server.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/signal_set.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/strand.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/core/tcp_stream.hpp>
#include <boost/beast/http.hpp>

#include <chrono>
#include <csignal>
#include <cstddef>
#include <iostream>
#include <memory>
#include <thread>
#include <utility>
#include <vector>

namespace Example {

namespace {

namespace asio = boost::asio;
namespace http = boost::beast::http;
using asio::ip::tcp;
using boost::system::error_code;

constexpr int THREADS = 4;                         // they verify, each one message at a time
constexpr std::size_t MAX_BODY = 1u << 20;         // a message with a token has some kilobytes
constexpr auto ALLOWED = std::chrono::seconds(10); // for one request and its answer
constexpr auto PAUSE = std::chrono::milliseconds(100);

/// One connection with one request.
class Session : public std::enable_shared_from_this<Session> {
public:
  Session(tcp::socket socket, const Handler &handler) : m_stream(std::move(socket)), m_handler(handler) {}

  void Start() {
    m_parser.body_limit(MAX_BODY);
    m_stream.expires_after(ALLOWED); // a client that is too slow ends its own connection only
    http::async_read(m_stream, m_buffer, m_parser, [self = shared_from_this()](error_code error, std::size_t) {
      if (!error) {
        self->Answer();
      }
    });
  }

private:
  void Answer() {
    Reply reply = m_handler(m_parser.get().body());
    m_response.result(reply.status);
    m_response.set(http::field::content_type, "text/xml; charset=utf-8");
    m_response.body() = std::move(reply.body);
    m_response.keep_alive(false);
    m_response.prepare_payload();
    http::async_write(m_stream, m_response, [self = shared_from_this()](error_code, std::size_t) {});
  }

  boost::beast::tcp_stream m_stream;
  boost::beast::flat_buffer m_buffer;
  http::request_parser<http::string_body> m_parser;
  http::response<http::string_body> m_response;
  const Handler &m_handler;
};

void Accept(tcp::acceptor &acceptor, asio::steady_timer &pause, const Handler &handler) {
  // Each connection has a strand, so that its time-out and its operations do not run on two threads at once.
  acceptor.async_accept(asio::make_strand(acceptor.get_executor()), [&](error_code error, tcp::socket socket) {
    if (!error) {
      std::make_shared<Session>(std::move(socket), handler)->Start();
      Accept(acceptor, pause, handler);
      return;
    }
    // No descriptor is left, for example. Requests that are under way will release theirs.
    pause.expires_after(PAUSE);
    pause.async_wait([&](error_code) { Accept(acceptor, pause, handler); });
  });
}

} // namespace

void Serve(unsigned short port, const Handler &handler) {
  asio::io_context context(THREADS);
  tcp::acceptor acceptor(context, tcp::endpoint(asio::ip::address_v4::loopback(), port));
  asio::steady_timer pause(context);
  asio::signal_set signals(context, SIGINT, SIGTERM);
  signals.async_wait([&context](error_code, int) { context.stop(); });
  Accept(acceptor, pause, handler);
  std::cout << "ready: http://127.0.0.1:" << acceptor.local_endpoint().port() << "/\n" << std::flush;

  std::vector<std::thread> threads;
  for (int i = 1; i < THREADS; ++i) {
    threads.emplace_back([&context] { context.run(); });
  }
  context.run();
  for (std::thread &thread : threads) {
    thread.join();
  }
}

} // namespace Example
