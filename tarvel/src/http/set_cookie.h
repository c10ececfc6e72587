// SPDX-License-Identifier: Apache-2.0
/// @file
/// Parsing of a Set-Cookie header's value.

#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace Tarvel::Http {

/// If an attribute is repeated, the last one counts (RFC 6265, section 5.3).
struct SetCookie {
  std::string name;
  std::string value;
  std::string domain;                  ///< without a leading dot; empty when absent
  std::string path;                    ///< empty when absent, or when it does not begin with "/"
  std::optional<std::int64_t> expires; ///< microseconds since 1970, UTC
  std::optional<std::int64_t> maxAge;  ///< seconds from now
  bool isSecure = false;
};

/// Parses by RFC 6265, section 5.2; nullopt for a header that must be ignored as a whole.
std::optional<SetCookie> ParseSetCookie(std::string_view text);

} // namespace Tarvel::Http
