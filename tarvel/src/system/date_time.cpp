// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/date_time.h>

#include "core/current_environment.h"
#include "core/fork_gate.h"
#include "system/date_time_text.h"

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <ctime>
#include <limits>

namespace Tarvel::System {

namespace {

using std::chrono::days;
using std::chrono::floor;
using std::chrono::microseconds;
using std::chrono::minutes;
using std::chrono::sys_days;
using std::chrono::year_month_day;

using TimePoint = std::chrono::sys_time<microseconds>;

constexpr std::int64_t SECONDS_PER_MINUTE = 60;

/// Zones further from UTC than this have no text in xsd:dateTime.
constexpr std::int64_t MAX_BIAS_MINUTES = 14 * 60;

constexpr std::int64_t MicrosecondsAt(sys_days day) {
  return microseconds(day.time_since_epoch()).count();
}

constexpr std::int64_t MIN_MICROSECONDS = MicrosecondsAt(std::chrono::year(1) / 1 / 1);
constexpr std::int64_t MAX_MICROSECONDS = MicrosecondsAt(std::chrono::year(10000) / 1 / 1) - 1;

constexpr bool IsInRange(std::int64_t value) {
  return value >= MIN_MICROSECONDS && value <= MAX_MICROSECONDS;
}

/// The local time at which the value is shown, as if it were UTC.
TimePoint Shown(const DateTime &value) {
  return TimePoint(microseconds(value.GetUtcTime()) + minutes(value.GetBiasMinutes()));
}

year_month_day DateOf(const DateTime &value) {
  return year_month_day(floor<days>(Shown(value)));
}

int YearOf(const DateTime &value) {
  return static_cast<int>(DateOf(value).year());
}

/// The number of whole `Unit`s since the last whole `Larger`, in the zone in which the value is shown.
template <typename Unit, typename Larger>
int UnitsInto(const DateTime &value) {
  const TimePoint shown = Shown(value);
  return static_cast<int>(floor<Unit>(shown - floor<Larger>(shown)).count());
}

/// Whether the point in time, shown with this bias, is within the years 1 to 9999.
bool CanShow(std::int64_t utcMicroseconds, std::int64_t biasMinutes) {
  return IsInRange(utcMicroseconds + microseconds(minutes(biasMinutes)).count());
}

/// The bias of the process's local zone at that time; 0 when it is unknown or cannot be written.
std::int32_t LocalBiasMinutes(std::int64_t utcMicroseconds) {
  const std::time_t seconds = floor<std::chrono::seconds>(microseconds(utcMicroseconds)).count();
  std::tm local{};
  const Computation computing; // the C library takes a lock
  if (!::localtime_r(&seconds, &local)) {
    return 0;
  }
  // Local mean times of the nineteenth century have seconds, which a bias cannot show.
  const std::int64_t bias = local.tm_gmtoff / SECONDS_PER_MINUTE;
  const bool isWritable = bias >= -MAX_BIAS_MINUTES && bias <= MAX_BIAS_MINUTES && CanShow(utcMicroseconds, bias);
  return isWritable ? static_cast<std::int32_t>(bias) : 0;
}

/// Reads a point in time and its bias. They are set only if the text is not refused.
DateTimeRefusal ReadDateTime(std::string_view text, std::int64_t &utcMicroseconds, std::int32_t &biasMinutes) noexcept {
  DateTimeFields fields{};
  if (const DateTimeRefusal refusal = ReadDateTimeText(text, fields)) {
    return refusal;
  }
  const year_month_day date(std::chrono::year(fields.year), std::chrono::month(fields.month),
                            std::chrono::day(fields.day));
  if (!date.ok()) {
    return {"the month does not have that day"};
  }
  const microseconds timeOfDay = std::chrono::hours(fields.hour) + minutes(fields.minute) +
                                 std::chrono::seconds(fields.second) + microseconds(fields.microsecond);
  const std::int64_t shown = MicrosecondsAt(date) + timeOfDay.count();
  const std::int64_t utc = shown - microseconds(minutes(fields.biasMinutes)).count();
  if (!IsInRange(shown) || !IsInRange(utc)) {
    return {"outside the years 1 to 9999"};
  }
  utcMicroseconds = utc;
  biasMinutes = fields.biasMinutes;
  return {};
}

void AppendDigits(std::string &text, int value, int digits) {
  text.append(static_cast<std::size_t>(digits), '0');
  for (std::size_t i = text.size(); digits > 0; --digits, value /= 10) {
    text[--i] = static_cast<char>('0' + value % 10);
  }
}

} // namespace

std::int64_t SecondsToMicroseconds(std::int64_t seconds) noexcept {
  std::int64_t product = 0;
  if (__builtin_mul_overflow(seconds, MICROSECONDS_PER_SECOND, &product)) {
    return seconds < 0 ? std::numeric_limits<std::int64_t>::min() : std::numeric_limits<std::int64_t>::max();
  }
  return product;
}

DateTime::DateTime(std::string_view text) {
  if (const DateTimeRefusal refusal = ReadDateTime(text, m_utcMicroseconds, m_biasMinutes)) {
    RefuseDateTimeText(text, refusal);
  }
}

bool DateTime::TryParse(std::string_view text, DateTime &date) noexcept {
  return !ReadDateTime(text, date.m_utcMicroseconds, date.m_biasMinutes);
}

DateTime DateTime::PlusMicroseconds(std::int64_t microseconds) const noexcept {
  std::int64_t sum = 0;
  if (__builtin_add_overflow(m_utcMicroseconds, microseconds, &sum)) {
    sum = microseconds < 0 ? MIN_MICROSECONDS : MAX_MICROSECONDS;
  }
  DateTime result;
  result.m_utcMicroseconds = std::clamp(sum, MIN_MICROSECONDS, MAX_MICROSECONDS);
  result.m_biasMinutes = CanShow(result.m_utcMicroseconds, m_biasMinutes) ? m_biasMinutes : 0;
  return result;
}

DateTime DateTime::PlusSeconds(std::int64_t seconds) const noexcept {
  return PlusMicroseconds(SecondsToMicroseconds(seconds));
}

int DateTime::GetCentury() const noexcept {
  return YearOf(*this) / 100;
}

int DateTime::GetYear() const noexcept {
  return YearOf(*this) % 100;
}

int DateTime::GetMonth() const noexcept {
  return static_cast<int>(static_cast<unsigned>(DateOf(*this).month()));
}

int DateTime::GetDay() const noexcept {
  return static_cast<int>(static_cast<unsigned>(DateOf(*this).day()));
}

int DateTime::GetDayOfWeek() const noexcept {
  return static_cast<int>(std::chrono::weekday(floor<days>(Shown(*this))).c_encoding());
}

int DateTime::GetHour() const noexcept {
  return UnitsInto<std::chrono::hours, days>(*this);
}

int DateTime::GetMinute() const noexcept {
  return UnitsInto<minutes, std::chrono::hours>(*this);
}

int DateTime::GetSecond() const noexcept {
  return UnitsInto<std::chrono::seconds, minutes>(*this);
}

int DateTime::GetMillisecond() const noexcept {
  return UnitsInto<std::chrono::milliseconds, std::chrono::seconds>(*this);
}

std::string DateTime::ToShortStringBias() const {
  if (m_biasMinutes == 0) {
    return "Z";
  }
  const int minutesAway = std::abs(m_biasMinutes);
  std::string text(1, m_biasMinutes < 0 ? '-' : '+');
  AppendDigits(text, minutesAway / 60, 2);
  text += ':';
  AppendDigits(text, minutesAway % 60, 2);
  return text;
}

std::string DateTime::ToString() const {
  const year_month_day date = DateOf(*this);
  std::string text;
  text.reserve(sizeof "2013-05-07T09:03:01.042+00:00");
  AppendDigits(text, static_cast<int>(date.year()), 4);
  text += '-';
  AppendDigits(text, GetMonth(), 2);
  text += '-';
  AppendDigits(text, GetDay(), 2);
  text += 'T';
  AppendDigits(text, GetHour(), 2);
  text += ':';
  AppendDigits(text, GetMinute(), 2);
  text += ':';
  AppendDigits(text, GetSecond(), 2);
  text += '.';
  AppendDigits(text, GetMillisecond(), 3);
  return text + ToShortStringBias();
}

DateTime DateTimeFromUtc(std::int64_t utcMicroseconds, bool local) {
  DateTime value;
  value.m_utcMicroseconds = std::clamp(utcMicroseconds, MIN_MICROSECONDS, MAX_MICROSECONDS);
  value.m_biasMinutes = local ? LocalBiasMinutes(value.m_utcMicroseconds) : 0;
  return value;
}

DateTime GetUtcDateTime() {
  const Environment *const environment = CurrentEnvironment();
  if (environment && environment->utcMicroseconds) {
    return DateTimeFromUtc(environment->utcMicroseconds(), false);
  }
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  return DateTimeFromUtc(floor<microseconds>(now).count(), false);
}

std::string FormatMessageArgument(const DateTime &value) {
  return value.ToString();
}

} // namespace Tarvel::System

namespace Tarvel {

std::string DatePrintFormatter::Format(const System::DateTime &value) {
  return value.ToString();
}

} // namespace Tarvel
