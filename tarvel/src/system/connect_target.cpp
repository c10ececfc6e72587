// SPDX-License-Identifier: Apache-2.0

#include "system/connect_target.h"

#include <tarvel/core/string_util.h>

namespace Tarvel::System {

namespace {

constexpr int MAX_PORT = 65535;

bool IsInBrackets(std::string_view host) noexcept {
  return host.size() > 2 && host.front() == '[' && host.back() == ']';
}

} // namespace

std::string RefuseTarget(std::string_view host, int port) {
  if (host.empty()) {
    return "the host name is empty";
  }
  for (const char c : host) {
    if (static_cast<unsigned char>(c) > 0x7E) {
      return "the host name is not ASCII (an internationalised name must be in its \"xn--\" form)";
    }
    if (c <= ' ') {
      return "the host name contains a blank or a control character";
    }
  }
  if (port < 1 || port > MAX_PORT) {
    return "the port is not between 1 and 65535";
  }
  if (IsInBrackets(host) && !ParseAddress(host)) {
    return "only an IPv6 address may be in brackets";
  }
  return {};
}

std::optional<boost::asio::ip::address> ParseAddress(std::string_view host) {
  // A string is passed, because `make_address` would copy a view itself. The function is `noexcept`, so a lack of memory
  // for its copy would end the process.
  const std::string text(IsInBrackets(host) ? host.substr(1, host.size() - 2) : host);
  boost::system::error_code notAnAddress;
  const boost::asio::ip::address address = boost::asio::ip::make_address(text, notAnAddress);
  return notAnAddress ? std::nullopt : std::optional(address);
}

std::string DescribeTarget(std::string_view host, int port) {
  const std::optional<boost::asio::ip::address> address = ParseAddress(host);
  const bool needsBrackets = address && address->is_v6() && host.front() != '[';
  return (needsBrackets ? "[" + std::string(host) + "]" : StringUtil::Shorten(host)) + ":" + std::to_string(port);
}

} // namespace Tarvel::System
