// SPDX-License-Identifier: Apache-2.0

#include <tarvel/http/http_date.h>

#include "http/cookie_date.h"

#include <cstdint>
#include <optional>

namespace Tarvel::Http {

boost::optional<System::DateTime> ParseHttpDate(std::string_view text) {
  const std::optional<std::int64_t> microseconds = ParseCookieDate(text);
  if (!microseconds) {
    return boost::none;
  }
  return System::DateTimeFromUtc(*microseconds, false);
}

} // namespace Tarvel::Http
