// SPDX-License-Identifier: Apache-2.0
/// @file
/// Points in time and their xsd:dateTime text.

#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

namespace DevSts {

/// UTC, in milliseconds.
using Time = std::chrono::sys_time<std::chrono::milliseconds>;

Time Now();

/// For example "2026-01-02T03:04:05.006Z".
std::string TimeText(Time time);

/// The form of a time in HTTP headers (RFC 9110, section 5.6.7), for example "Fri, 02 Jan 2026 03:04:05 GMT".
std::string HttpTimeText(Time time);

/// Reads the form that `TimeText` writes. The fraction is optional, and cut to milliseconds. Returns none for any other
/// text.
std::optional<Time> ParseTime(std::string_view text);

} // namespace DevSts
