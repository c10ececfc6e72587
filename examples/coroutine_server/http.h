// SPDX-License-Identifier: Apache-2.0
/// @file
/// The part of HTTP that the services of the example need: answer requests, and post one.

#pragma once

#include <boost/asio/awaitable.hpp>
#include <boost/asio/ip/tcp.hpp>

#include <chrono>
#include <functional>
#include <string>

namespace Example {

using TimePoint = std::chrono::steady_clock::time_point;

struct Reply {
  unsigned status = 0;
  std::string text;
};

/// Answers one request, of which it gets the body. After the deadline, the caller no longer waits.
using Handler = std::function<boost::asio::awaitable<Reply>(std::string body, TimePoint deadline)>;

/// Answers each request that arrives at the acceptor, any number at once, until the coroutine is destroyed.
boost::asio::awaitable<void> Serve(boost::asio::ip::tcp::acceptor acceptor, Handler handler);

/// Posts the body to a service on loopback.
/// @throws std::exception when there is no answer before the deadline
boost::asio::awaitable<Reply> Post(unsigned short port, std::string body, TimePoint deadline);

} // namespace Example
