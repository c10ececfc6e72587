// SPDX-License-Identifier: Apache-2.0
/// @file
/// The host and port of a connection, as a caller writes them.

#pragma once

#include <boost/asio/ip/address.hpp>

#include <optional>
#include <string>
#include <string_view>

namespace Tarvel::System {

/// Why no connection to `host` and `port` can be tried; empty when `host` and `port` are valid.
std::string RefuseTarget(std::string_view host, int port);

/// The address in `host`, with or without brackets; `std::nullopt` when `host` is not an address.
std::optional<boost::asio::ip::address> ParseAddress(std::string_view host);

/// "host:port" or "[IPv6 address]:port", for messages.
std::string DescribeTarget(std::string_view host, int port);

} // namespace Tarvel::System
