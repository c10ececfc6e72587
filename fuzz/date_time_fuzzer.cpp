// SPDX-License-Identifier: Apache-2.0
/// @file
/// Date-time text: an accepted text has the published lexical form, means the instant that the C library computes from
/// its fields, and gives the same instant when it is written and read again. A refusal is the one documented exception.

#include <tarvel/core/exception.h>
#include <tarvel/system/date_time.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <regex>
#include <string>
#include <string_view>

namespace {

using Tarvel::System::DateTime;
using Tarvel::System::DateTimeFromUtc;

constexpr std::int64_t MICROSECONDS = 1'000'000;

/// std::regex recurses with the length of its input, so a longer fraction is not compared.
constexpr std::size_t MAX_COMPARED_LENGTH = 64;

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

int Field(const std::cmatch &match, std::size_t group) {
  return std::atoi(match.str(group).c_str());
}

/// Reads the fields in a second way: a regular expression checks the form, and the C library the calendar. False when
/// the text has another form, or when the calendar changes a field.
bool ReadByCLibrary(std::string_view text, std::int64_t &utc) {
  static const std::regex form("([0-9]{4})-([0-9]{2})-([0-9]{2})T([0-9]{2}):([0-9]{2}):([0-9]{2})(\\.([0-9]+))?"
                               "(Z|([+-])([0-9]{2}):([0-9]{2}))?");
  std::cmatch match;
  if (!std::regex_match(text.data(), text.data() + text.size(), match, form)) {
    return false;
  }
  std::tm fields{};
  fields.tm_year = Field(match, 1) - 1900;
  fields.tm_mon = Field(match, 2) - 1;
  fields.tm_mday = Field(match, 3);
  fields.tm_hour = Field(match, 4);
  fields.tm_min = Field(match, 5);
  fields.tm_sec = Field(match, 6);
  const std::string fraction = match.str(8);
  const bool isDaysEnd = fields.tm_hour == 24 && fields.tm_min == 0 && fields.tm_sec == 0 &&
                         fraction.find_first_not_of('0') == std::string::npos;
  if (isDaysEnd) {
    fields.tm_hour = 0;
  }
  const std::tm written = fields;
  const std::int64_t seconds = ::timegm(&fields);
  const bool kept = fields.tm_year == written.tm_year && fields.tm_mon == written.tm_mon &&
                    fields.tm_mday == written.tm_mday && fields.tm_hour == written.tm_hour &&
                    fields.tm_min == written.tm_min && fields.tm_sec == written.tm_sec;
  const int zoneMinutes = Field(match, 11) * 60 + Field(match, 12);
  // XML Schema 1.0 has no year 0, not even for the end of its last day, which would be in year 1.
  const bool isYearZero = fields.tm_year == -1900;
  if (!kept || isYearZero || Field(match, 12) > 59 || zoneMinutes > 14 * 60) {
    return false;
  }
  const std::int64_t shown = seconds + (isDaysEnd ? 86'400 : 0);
  const std::int64_t inUtc = shown - (match.str(10) == "-" ? -1 : 1) * std::int64_t{zoneMinutes} * 60;
  utc = inUtc * MICROSECONDS + std::atoi((fraction + "000000").substr(0, 6).c_str());
  const auto inCalendar = [](std::int64_t value) { return value >= -62'135'596'800 && value < 253'402'300'800; };
  return inCalendar(shown) && inCalendar(inUtc);
}

void CheckText(std::string_view text) {
  std::int64_t expected = 0;
  const bool compared = text.size() <= MAX_COMPARED_LENGTH;
  const bool valid = compared && ReadByCLibrary(text, expected);
  try {
    const DateTime value(text);
    if (compared) {
      Require(valid && value.GetUtcTime() == expected);
    }
    const DateTime again(value.ToString());
    Require(again.ToString() == value.ToString());
    Require(again.GetBiasMinutes() == value.GetBiasMinutes());
    Require(value.GetUtcTime() - again.GetUtcTime() >= 0 && value.GetUtcTime() - again.GetUtcTime() < 1000);
  } catch (const Tarvel::DateTimeFormatException &error) {
    Require(!valid);
    Require(*error.what() != '\0');
  }
}

void CheckInstant(std::int64_t utc) {
  for (const bool local : {false, true}) {
    const DateTime value = DateTimeFromUtc(utc, local);
    const DateTime again(value.ToString());
    Require(again.ToString() == value.ToString());
    Require(value.GetUtcTime() - again.GetUtcTime() >= 0 && value.GetUtcTime() - again.GetUtcTime() < 1000);
    Require(DateTimeFromUtc(value.GetUtcTime(), local).GetUtcTime() == value.GetUtcTime());
  }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  CheckText(std::string_view(reinterpret_cast<const char *>(data), size));
  std::int64_t utc = 0;
  if (size >= sizeof utc) {
    std::memcpy(&utc, data, sizeof utc);
    CheckInstant(utc);
    CheckInstant(utc / (1 << 6));
  }
  return 0;
}
