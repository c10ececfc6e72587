// SPDX-License-Identifier: Apache-2.0
/// @file
/// One TLS connection: reads requests, has them handled, delivers the answers.

#pragma once

#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ssl/context.hpp>

#include <atomic>

namespace DevSts {

class RequestHandler;

/// Starts the handshake on `socket`, then serves the client's requests. The connection lives as long as one of its
/// operations is under way. Everything runs on the strand of its socket. All references outlive the connection. `count`
/// is one higher while it lives.
void StartConnection(boost::asio::ip::tcp::socket socket, boost::asio::ssl::context &tls, const RequestHandler &handler,
                     std::atomic<int> &count);

} // namespace DevSts
