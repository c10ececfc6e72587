// SPDX-License-Identifier: Apache-2.0
/// @file
/// The fields of an xsd:dateTime text.

#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace Tarvel::System {

/// The fields as written. Each is in its own range; whether the month has that day is not checked yet.
struct DateTimeFields {
  int year;                 ///< 1 to 9999
  unsigned month;           ///< 1 to 12
  unsigned day;             ///< 1 to 31
  int hour;                 ///< 0 to 24; with 24, all finer fields are 0
  int minute;               ///< 0 to 59
  int second;               ///< 0 to 59
  int microsecond;          ///< 0 to 999999
  std::int32_t biasMinutes; ///< minutes east of UTC, -840 to 840
};

/// Why a text is not a date-time. The message is composed only when an exception is thrown.
struct DateTimeRefusal {
  const char *reason = nullptr; ///< null if the text is not refused
  std::size_t character = 0;    ///< from 1; 0 if the reason is not about a character

  explicit operator bool() const noexcept { return reason; }
};

/// Splits `text` into its fields. Returns why the text is refused, if it has another form or a field is out of its
/// range.
DateTimeRefusal ReadDateTimeText(std::string_view text, DateTimeFields &fields) noexcept;

/// Throws a `DateTimeFormatException` that quotes `text`.
[[noreturn]] void RefuseDateTimeText(std::string_view text, const DateTimeRefusal &refusal);

} // namespace Tarvel::System
