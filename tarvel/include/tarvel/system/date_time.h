// SPDX-License-Identifier: Apache-2.0
/// @file
/// `DateTime`, a point in time with its calendar fields.

#pragma once

#include <tarvel/core/export.h>

#include <chrono>
#include <cstdint>
#include <string>
#include <string_view>

namespace Tarvel::System {

/// The number of microseconds in a second.
constexpr std::int64_t MICROSECONDS_PER_SECOND = 1'000'000;

/// `seconds` in microseconds, or the nearest `std::int64_t`: an absurdly large number means "always" or "never", and
/// does not wrap around into its opposite.
TARVEL_API std::int64_t SecondsToMicroseconds(std::int64_t seconds) noexcept;

/// A point in time: microseconds since 1970-01-01T00:00:00Z (leap seconds not counted, as in POSIX), from year 1 to
/// year 9999 of the proleptic Gregorian calendar, together with the zone bias in which its fields are shown. A plain
/// value.
class TARVEL_API DateTime {
public:
  /// 1970-01-01T00:00:00Z.
  constexpr DateTime() noexcept = default;

  /// The date-time written in `text`, of the form xsd:dateTime (XML Schema 1.0, part 2, section 3.2.7): four-digit
  /// year, any number of fraction digits (all after the sixth are ignored), zone "Z", "+hh:mm", "-hh:mm" up to 14
  /// hours, or none, which means UTC. 24:00:00 is the next day's start. White space around it is not accepted. The
  /// fields are shown in the zone of the text.
  /// @throws DateTimeFormatException when the text has another form or a field is out of range.
  explicit DateTime(std::string_view text);

  /// The same without an exception, for programs that read many texts, some of which have another form.
  /// @return whether `text` is a date-time; `date` is set only then.
  static bool TryParse(std::string_view text, DateTime &date) noexcept;

  /// `time`, shown in UTC: rounded down to a microsecond, and outside the years 1 to 9999 the nearest point inside.
  /// `Duration` is any `std::chrono::duration`; a floating-point "not a number" becomes the start of year 1.
  template <typename Duration>
  static DateTime FromTimePoint(std::chrono::time_point<std::chrono::system_clock, Duration> time);

  /// The same point in time for `std::chrono`. Compare it in microseconds: `std::chrono::system_clock::time_point` may
  /// be unable to represent it, because nanoseconds in 64 bits end in the year 2262.
  constexpr std::chrono::time_point<std::chrono::system_clock, std::chrono::microseconds> ToTimePoint() const noexcept {
    return std::chrono::time_point<std::chrono::system_clock, std::chrono::microseconds>(
        std::chrono::microseconds(m_utcMicroseconds));
  }

  /// Microseconds since the epoch, UTC.
  constexpr std::int64_t GetUtcTime() const noexcept { return m_utcMicroseconds; }

  /// The microseconds from `other` to this point; negative when this one is earlier. Exact for any two points.
  constexpr std::int64_t MicrosecondsSince(const DateTime &other) const noexcept {
    return m_utcMicroseconds - other.m_utcMicroseconds;
  }

  /// The point that is this much later, or earlier for a negative number; outside the years 1 to 9999 the nearest point
  /// inside (it saturates). The bias is kept, except where a field would leave these years: there it becomes 0.
  DateTime PlusMicroseconds(std::int64_t microseconds) const noexcept;
  DateTime PlusSeconds(std::int64_t seconds) const noexcept;

  // The fields, in the zone of the bias. The calendar year is 100 * GetCentury() + GetYear().

  int GetCentury() const noexcept;                              ///< the year divided by 100: 20 for 2013
  int GetYear() const noexcept;                                 ///< the year within its century: 13 for 2013
  int GetMonth() const noexcept;                                ///< 1 to 12
  int GetDay() const noexcept;                                  ///< day of month, 1 to 31
  int GetDayOfWeek() const noexcept;                            ///< 0 (Sunday) to 6
  int GetHour() const noexcept;                                 ///< 0 to 23
  int GetMinute() const noexcept;                               ///< 0 to 59
  int GetSecond() const noexcept;                               ///< 0 to 59
  int GetMillisecond() const noexcept;                          ///< 0 to 999
  int GetBiasMinutes() const noexcept { return m_biasMinutes; } ///< minutes east of UTC in which the fields are shown

  /// "Z" for a zero bias, otherwise the offset as "+hh:mm" or "-hh:mm".
  std::string ToShortStringBias() const;

  /// The platform's own text form: xsd:dateTime with three fraction digits and the zone, such as
  /// 2013-05-07T09:03:01.042Z.
  std::string ToString() const;

  /// Values are compared by their points in time; the bias is ignored.
  friend constexpr bool operator==(const DateTime &a, const DateTime &b) noexcept {
    return a.m_utcMicroseconds == b.m_utcMicroseconds;
  }
  friend constexpr bool operator!=(const DateTime &a, const DateTime &b) noexcept { return !(a == b); }
  friend constexpr bool operator<(const DateTime &a, const DateTime &b) noexcept {
    return a.m_utcMicroseconds < b.m_utcMicroseconds;
  }

private:
  friend TARVEL_API DateTime DateTimeFromUtc(std::int64_t utcMicroseconds, bool local);

  std::int64_t m_utcMicroseconds = 0;
  std::int32_t m_biasMinutes = 0;
};

/// The point `utcMicroseconds` after the epoch; outside the years 1 to 9999 the nearest point inside (it saturates).
/// @param local true to show the fields in the process's local zone, false for UTC.
TARVEL_API DateTime DateTimeFromUtc(std::int64_t utcMicroseconds, bool local);

/// Now, in UTC, from the system's real-time clock, or from the clock of a `ScopedEnvironment`.
TARVEL_API DateTime GetUtcDateTime();

/// A date-time as a message argument: its `ToString` text.
TARVEL_API std::string FormatMessageArgument(const DateTime &value);

template <typename Duration>
DateTime DateTime::FromTimePoint(std::chrono::time_point<std::chrono::system_clock, Duration> time) {
  using std::chrono::microseconds;
  // Beyond every date in both directions, but far below the values at which the exact conversion would overflow.
  constexpr long double FAR_AWAY = 4e17L;
  const long double roughly = std::chrono::duration<long double, std::micro>(time.time_since_epoch()).count();
  if (roughly > -FAR_AWAY && roughly < FAR_AWAY) {
    // The whole seconds and the rest are converted separately, because one conversion of a long time in a fine period
    // would overflow. `floor` would, too, for the seconds: it compares in the fine period.
    const auto sinceEpoch = time.time_since_epoch();
    const auto whole = std::chrono::duration_cast<std::chrono::seconds>(sinceEpoch);
    return DateTimeFromUtc(microseconds(whole).count() + std::chrono::floor<microseconds>(sinceEpoch - whole).count(),
                           false);
  }
  return DateTimeFromUtc(roughly > 0 ? microseconds::max().count() : microseconds::min().count(), false);
}

} // namespace Tarvel::System

namespace Tarvel {

/// How log lines show a date-time.
class TARVEL_API DatePrintFormatter {
public:
  DatePrintFormatter() = delete;
  /// `DateTime::ToString` of `value`.
  static std::string Format(const System::DateTime &value);
};

} // namespace Tarvel
