// SPDX-License-Identifier: Apache-2.0
/// @file
/// Moments as text: in UTC, and how far they are from now.

#pragma once

#include <tarvel/system/date_time.h>

#include <cstdint>
#include <string>

namespace SsoClient::Tool {

/// `time` in UTC, with milliseconds.
std::string UtcText(const Tarvel::System::DateTime &time);

/// A number of seconds in its two largest units, such as "7 h 12 min" or "45 s". The sign is ignored, and smaller units
/// are dropped: 3,675 seconds are "1 h 1 min". From 100 days on, only days are shown.
std::string SpanText(std::int64_t seconds);

/// How far `time` is from `now`: "in 7 h 12 min", "3 d 4 h ago", or "now" if they differ by less than a second.
std::string WhenText(const Tarvel::System::DateTime &time, const Tarvel::System::DateTime &now);

} // namespace SsoClient::Tool
