// SPDX-License-Identifier: Apache-2.0
/// @file
/// The value of a Set-Cookie header, taken apart.

#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace Tarvel::Http {

/// The last of each attribute, as RFC 6265, section 5.3, wants it.
struct SetCookie {
  std::string name;
  std::string value;
  std::string domain;                  ///< without a leading dot; empty for none
  std::string path;                    ///< empty for none, or one that does not begin with "/"
  std::optional<std::int64_t> expires; ///< microseconds since 1970, UTC
  std::optional<std::int64_t> maxAge;  ///< seconds from now
  bool isSecure = false;
};

/// Parses as RFC 6265, section 5.2, says; none for what is to be ignored as a whole.
std::optional<SetCookie> ParseSetCookie(std::string_view text);

} // namespace Tarvel::Http
