// SPDX-License-Identifier: Apache-2.0
/// @file
/// The part of HTTP that a service on loopback needs.

#pragma once

#include <boost/beast/http/message.hpp>
#include <boost/beast/http/string_body.hpp>

#include <functional>

namespace Example {

using Request = boost::beast::http::request<boost::beast::http::string_body>;
using Response = boost::beast::http::response<boost::beast::http::string_body>;

/// Answers a request. It is called on several threads at once, and must not throw.
using Handler = std::function<Response(const Request &request)>;

/// Prints the address, and answers each request at the port, until SIGINT or SIGTERM.
/// @param port 0 for a free one
/// @throws std::exception when the port cannot be used
void Serve(unsigned short port, const Handler &handler);

} // namespace Example
