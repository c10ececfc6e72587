// SPDX-License-Identifier: Apache-2.0

#include "http.h"

#include <boost/asio/co_spawn.hpp>
#include <boost/asio/detached.hpp>
#include <boost/asio/redirect_error.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/this_coro.hpp>
#include <boost/asio/use_awaitable.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/core/tcp_stream.hpp>
#include <boost/beast/http.hpp>

#include <exception>
#include <iostream>
#include <memory>
#include <utility>

namespace Example {

namespace {

namespace asio = boost::asio;
namespace http = boost::beast::http;
using asio::use_awaitable;
using boost::beast::tcp_stream;

constexpr std::chrono::seconds ALLOWED(10);
constexpr std::size_t MAX_BODY = 1u << 20; // a token has some kilobytes

asio::awaitable<void> AnswerOne(tcp_stream stream, const Handler &handler) {
  const TimePoint deadline = std::chrono::steady_clock::now() + ALLOWED;
  stream.expires_at(deadline); // ends each operation of the stream
  boost::beast::flat_buffer buffer;
  http::request_parser<http::string_body> parser;
  parser.body_limit(MAX_BODY);
  co_await http::async_read(stream, buffer, parser, use_awaitable);

  const Reply reply = co_await handler(std::move(parser.get().body()), deadline);

  http::response<http::string_body> response(http::int_to_status(reply.status), 11);
  response.set(http::field::content_type, "text/plain; charset=utf-8");
  response.body() = reply.text + '\n';
  response.keep_alive(false);
  response.prepare_payload();
  stream.expires_after(std::chrono::seconds(1)); // so that a reply about the deadline can still be sent
  co_await http::async_write(stream, response, use_awaitable);
}

asio::awaitable<void> Answer(asio::ip::tcp::socket socket, std::shared_ptr<const Handler> handler) {
  try {
    co_await AnswerOne(tcp_stream(std::move(socket)), *handler);
  } catch (const std::exception &error) {
    std::cerr << "a request was not answered: " << error.what() << '\n'; // for example, its client is too slow
  }
}

} // namespace

asio::awaitable<void> Serve(asio::ip::tcp::acceptor acceptor, Handler handler) {
  const auto shared = std::make_shared<const Handler>(std::move(handler));
  for (;;) {
    boost::system::error_code error;
    asio::ip::tcp::socket socket = co_await acceptor.async_accept(asio::redirect_error(use_awaitable, error));
    if (error) {
      // No descriptor is left, for example. Requests that are under way will release theirs.
      asio::steady_timer pause(co_await asio::this_coro::executor, std::chrono::milliseconds(100));
      co_await pause.async_wait(use_awaitable);
      continue;
    }
    asio::co_spawn(co_await asio::this_coro::executor, Answer(std::move(socket), shared), asio::detached);
  }
}

asio::awaitable<Reply> Post(unsigned short port, std::string body, TimePoint deadline) {
  tcp_stream stream(co_await asio::this_coro::executor);
  stream.expires_at(deadline);
  co_await stream.async_connect(asio::ip::tcp::endpoint(asio::ip::address_v4::loopback(), port), use_awaitable);

  http::request<http::string_body> request(http::verb::post, "/", 11);
  request.set(http::field::host, "localhost");
  request.body() = std::move(body);
  request.keep_alive(false);
  request.prepare_payload();
  co_await http::async_write(stream, request, use_awaitable);

  boost::beast::flat_buffer buffer;
  http::response<http::string_body> response;
  co_await http::async_read(stream, buffer, response, use_awaitable);
  co_return Reply{response.result_int(), std::move(response.body())};
}

} // namespace Example
