// SPDX-License-Identifier: Apache-2.0

#include "time_text.h"

#include <string_view>

namespace SsoClient::Tool {
namespace {

constexpr std::uint64_t MINUTE_SEC = 60;
constexpr std::uint64_t HOUR_SEC = 60 * MINUTE_SEC;
constexpr std::uint64_t DAY_SEC = 24 * HOUR_SEC;
constexpr std::uint64_t DAYS_ALONE_FROM_SEC = 100 * DAY_SEC;

/// `seconds` in `unit`, and the rest in the next smaller unit.
std::string InUnits(std::uint64_t seconds, std::uint64_t unit, std::string_view name, std::uint64_t smaller,
                    std::string_view smallerName) {
  std::string text = std::to_string(seconds / unit) + std::string(name);
  const std::uint64_t rest = seconds % unit / smaller;
  return rest == 0 ? text : text + " " + std::to_string(rest) + std::string(smallerName);
}

} // namespace

std::string UtcText(const Tarvel::System::DateTime &time) {
  return Tarvel::System::DateTimeFromUtc(time.GetUtcTime(), false).ToString();
}

std::string SpanText(std::int64_t seconds) {
  // The smallest number has no positive counterpart of its own type.
  const auto bits = static_cast<std::uint64_t>(seconds);
  const std::uint64_t span = seconds < 0 ? 0 - bits : bits;
  if (span >= DAYS_ALONE_FROM_SEC) {
    return std::to_string(span / DAY_SEC) + " d";
  }
  if (span >= DAY_SEC) {
    return InUnits(span, DAY_SEC, " d", HOUR_SEC, " h");
  }
  if (span >= HOUR_SEC) {
    return InUnits(span, HOUR_SEC, " h", MINUTE_SEC, " min");
  }
  if (span >= MINUTE_SEC) {
    return InUnits(span, MINUTE_SEC, " min", 1, " s");
  }
  return std::to_string(span) + " s";
}

std::string WhenText(const Tarvel::System::DateTime &time, const Tarvel::System::DateTime &now) {
  const std::int64_t seconds = time.MicrosecondsSince(now) / Tarvel::System::MICROSECONDS_PER_SECOND;
  if (seconds == 0) {
    return "now";
  }
  return seconds > 0 ? "in " + SpanText(seconds) : SpanText(seconds) + " ago";
}

} // namespace SsoClient::Tool
