// SPDX-License-Identifier: Apache-2.0
/// @file
/// The date of a cookie's Expires attribute.

#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace Tarvel::Http {

/// The date in `text` as microseconds since 1970, UTC, by the lenient rules of RFC 6265, section 5.1.1; nullopt when
/// `text` contains no date.
std::optional<std::int64_t> ParseCookieDate(std::string_view text);

} // namespace Tarvel::Http
