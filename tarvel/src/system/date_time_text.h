// SPDX-License-Identifier: Apache-2.0
/// @file
/// The fields of an xsd:dateTime text.

#pragma once

#include <cstdint>
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

/// Splits `text` into its fields.
/// @throws DateTimeFormatException when `text` has another form, or a field is out of its range.
DateTimeFields ParseDateTimeText(std::string_view text);

/// Throws a `DateTimeFormatException` that quotes `text`.
[[noreturn]] void RefuseDateTimeText(std::string_view text, std::string_view reason);

} // namespace Tarvel::System
