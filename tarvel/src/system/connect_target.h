// SPDX-License-Identifier: Apache-2.0
/// @file
/// The host and port of a connection, as a caller writes them.

#pragma once

#include <boost/asio/ip/address.hpp>

#include <optional>
#include <string>
#include <string_view>

namespace Tarvel::System {

/// The reason why no connection to `host` and `port` can be tried; empty when one can.
std::string RefuseTarget(std::string_view host, int port);

/// The address that `host` is, with or without brackets; `std::nullopt` when it is a name.
std::optional<boost::asio::ip::address> ParseAddress(std::string_view host);

/// "host:port" or "[IPv6 address]:port", for messages.
std::string DescribeTarget(std::string_view host, int port);

} // namespace Tarvel::System
