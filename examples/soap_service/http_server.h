// SPDX-License-Identifier: Apache-2.0
/// @file
/// The part of HTTP that a service on loopback needs.

#pragma once

#include <functional>
#include <string>

namespace Example {

struct Reply {
  unsigned status = 200;
  std::string body; // XML
};

/// Answers a request, of which it gets the body. It is called on several threads at once, and must not throw.
using Handler = std::function<Reply(const std::string &body)>;

/// Prints the address, and answers each request at the port, until SIGINT or SIGTERM.
/// @param port 0 for a free one
/// @throws std::exception when the port cannot be used
void Serve(unsigned short port, const Handler &handler);

} // namespace Example
