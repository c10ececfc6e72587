// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/date_time.h>

#include "unit/tarvel_system/microseconds.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/message_formatter.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <ctime>
#include <random>
#include <string>
#include <string_view>

namespace Tarvel::System {
namespace {

using Testing::HIGHEST;
using Testing::LOWEST;
using Testing::SECOND;

constexpr std::int64_t HOUR = 3600 * SECOND;
constexpr std::int64_t DAY = 24 * HOUR;

std::int64_t UtcOf(std::string_view text) {
  return DateTime(text).GetUtcTime();
}

std::string RefusalOf(std::string_view text) {
  DateTime tried("2001-01-01T00:00:00+01:00");
  const bool isAccepted = DateTime::TryParse(text, tried);
  try {
    const DateTime value(text);
    EXPECT_TRUE(isAccepted) << text;
    EXPECT_EQ(value.ToString(), tried.ToString());
    return "accepted as " + value.ToString();
  } catch (const DateTimeFormatException &error) {
    EXPECT_FALSE(isAccepted) << text;
    EXPECT_EQ("2001-01-01T00:00:00.000+01:00", tried.ToString());
    return error.what();
  }
}

std::string Refused(std::string_view text, std::string_view reason) {
  return "\"" + std::string(text) + "\" is not a date-time: " + std::string(reason);
}

TEST(DateTime, StartsAtTheEpoch) {
  EXPECT_EQ(DateTime().GetUtcTime(), 0);
  EXPECT_EQ(DateTime().ToString(), "1970-01-01T00:00:00.000Z");
}

TEST(DateTime, HasTheFieldsOfItsText) {
  const DateTime value("2013-05-07T09:03:01.042Z");
  EXPECT_EQ(value.GetCentury(), 20);
  EXPECT_EQ(value.GetYear(), 13);
  EXPECT_EQ(value.GetMonth(), 5);
  EXPECT_EQ(value.GetDay(), 7);
  EXPECT_EQ(value.GetDayOfWeek(), 2);
  EXPECT_EQ(value.GetHour(), 9);
  EXPECT_EQ(value.GetMinute(), 3);
  EXPECT_EQ(value.GetSecond(), 1);
  EXPECT_EQ(value.GetMillisecond(), 42);
  EXPECT_EQ(value.GetBiasMinutes(), 0);
  EXPECT_EQ(value.GetUtcTime(), 1'367'917'381'042'000);
}

TEST(DateTime, HasTheUtcTimeOfItsText) {
  struct Row {
    const char *text;
    std::int64_t utc;
  };
  const Row table[] = {
      {"1970-01-01T00:00:00Z", 0},
      {"1970-01-01T00:00:00", 0},
      {"1969-12-31T23:59:59.999999Z", -1},
      {"1970-01-01T00:00:00.000001Z", 1},
      {"1970-01-01T00:00:00.0000019Z", 1},
      {"1970-01-01T00:00:00.5Z", 500'000},
      {"1970-01-01T00:00:00.05Z", 50'000},
      {"1970-01-01T00:00:00.12Z", 120'000},
      {"1970-01-01T00:00:00.123Z", 123'000},
      {"1970-01-01T00:00:00.1234Z", 123'400},
      {"1970-01-01T00:00:00.12345Z", 123'450},
      {"1970-01-01T00:00:00.123456Z", 123'456},
      {"1970-01-01T00:00:00.123456789012345678901234567890Z", 123'456},
      {"1970-01-01T00:00:00.000000000000000000000000000000Z", 0},
      {"1970-01-01T01:00:00+01:00", 0},
      {"1969-12-31T18:30:00-05:30", 0},
      {"1970-01-01T14:00:00+14:00", 0},
      {"1969-12-31T10:00:00-14:00", 0},
      {"1970-01-01T00:00:00+00:00", 0},
      {"1970-01-01T00:00:00-00:00", 0},
      {"1970-01-01T00:00:00.25+00:01", 250'000 - 60 * SECOND},
      {"1970-01-01T24:00:00Z", DAY},
      {"1970-01-01T24:00:00.000Z", DAY},
      {"1969-12-31T24:00:00Z", 0},
      {"2038-01-19T03:14:08Z", 2'147'483'648 * SECOND},
      {"0001-01-01T00:00:00Z", -62'135'596'800 * SECOND},
      {"9999-12-31T23:59:59.999999Z", 253'402'300'800 * SECOND - 1},
  };
  for (const Row &row : table) {
    EXPECT_EQ(UtcOf(row.text), row.utc) << row.text;
  }
}

TEST(DateTime, ShowsItsFieldsInTheZoneOfTheText) {
  const DateTime value("2024-02-28T23:30:00.007-02:45");
  EXPECT_EQ(value.GetDay(), 28);
  EXPECT_EQ(value.GetHour(), 23);
  EXPECT_EQ(value.GetMinute(), 30);
  EXPECT_EQ(value.GetBiasMinutes(), -165);
  EXPECT_EQ(value.ToShortStringBias(), "-02:45");
  EXPECT_EQ(value.ToString(), "2024-02-28T23:30:00.007-02:45");
  EXPECT_EQ(DateTimeFromUtc(value.GetUtcTime(), false).ToString(), "2024-02-29T02:15:00.007Z");
}

TEST(DateTime, ComparesPointsInTimeWhateverTheirZone) {
  const DateTime utc("2024-01-01T12:00:00Z");
  const DateTime east("2024-01-01T14:00:00+02:00");
  const DateTime later("2024-01-01T12:00:00.000001Z");
  EXPECT_TRUE(utc == east);
  EXPECT_FALSE(utc != east);
  EXPECT_FALSE(utc < east);
  EXPECT_TRUE(east < later);
  EXPECT_TRUE(utc != later);
}

TEST(DateTime, FollowsTheLeapYearRuleOfTheGregorianCalendar) {
  for (const char *leap :
       {"2024-02-29T00:00:00Z", "2000-02-29T00:00:00Z", "1600-02-29T00:00:00Z", "0004-02-29T00:00:00Z"}) {
    EXPECT_EQ(DateTime(leap).GetDay(), 29) << leap;
  }
  for (const char *common :
       {"2023-02-29T00:00:00Z", "1900-02-29T00:00:00Z", "2100-02-29T00:00:00Z", "0001-02-29T00:00:00Z"}) {
    EXPECT_EQ(RefusalOf(common), Refused(common, "the month does not have that day"));
  }
}

TEST(DateTime, ReadsHour24AsTheStartOfTheNextDay) {
  EXPECT_EQ(DateTime("2024-02-29T24:00:00Z").ToString(), "2024-03-01T00:00:00.000Z");
  EXPECT_EQ(DateTime("2023-12-31T24:00:00.0+01:00").ToString(), "2024-01-01T00:00:00.000+01:00");
}

TEST(DateTime, RefusesFieldsOutOfRange) {
  struct Row {
    const char *text;
    const char *reason;
  };
  const Row table[] = {
      {"0000-01-01T00:00:00Z", "year out of range"},
      {"0000-12-31T24:00:00Z", "year out of range"},
      {"2024-00-01T00:00:00Z", "month out of range"},
      {"2024-13-01T00:00:00Z", "month out of range"},
      {"2024-01-00T00:00:00Z", "day out of range"},
      {"2024-01-32T00:00:00Z", "day out of range"},
      {"2024-04-31T00:00:00Z", "the month does not have that day"},
      {"2024-02-30T00:00:00Z", "the month does not have that day"},
      {"2024-01-01T25:00:00Z", "hour out of range"},
      {"2024-01-01T24:00:01Z", "hour out of range"},
      {"2024-01-01T24:01:00Z", "hour out of range"},
      {"2024-01-01T24:00:00.001Z", "hour out of range"},
      {"2024-01-01T24:00:00.0000001Z", "hour out of range"},
      {"2024-01-01T00:60:00Z", "minute out of range"},
      {"2024-01-01T00:00:60Z", "second out of range"},
      {"2016-12-31T23:59:60Z", "second out of range"},
      {"2024-01-01T00:00:00+15:00", "zone out of range"},
      {"2024-01-01T00:00:00+14:01", "zone out of range"},
      {"2024-01-01T00:00:00-14:30", "zone out of range"},
      {"2024-01-01T00:00:00+01:60", "zone out of range"},
      {"0001-01-01T00:00:00+00:01", "outside the years 1 to 9999"},
      {"9999-12-31T23:59:59-00:01", "outside the years 1 to 9999"},
      {"9999-12-31T24:00:00Z", "outside the years 1 to 9999"},
      {"9999-12-31T24:00:00+05:00", "outside the years 1 to 9999"},
  };
  for (const Row &row : table) {
    EXPECT_EQ(RefusalOf(row.text), Refused(row.text, row.reason));
  }
}

TEST(DateTime, RefusesTextOfAnotherForm) {
  struct Row {
    std::string text;
    const char *reason;
  };
  const Row table[] = {
      {"", "cut short"},
      {"yesterday", "malformed at character 1"},
      {" 2024-01-01T00:00:00Z", "malformed at character 1"},
      {"2024-01-01T00:00:00Z ", "malformed at character 21"},
      {"2024-01-01T00:00:00 Z", "malformed at character 20"},
      {"2024-01-01T00:00:00ZZ", "malformed at character 21"},
      {"2024-01-01T00:00:00z", "malformed at character 20"},
      {"2024-01-01t00:00:00Z", "malformed at character 11"},
      {"2024-01-01 00:00:00Z", "malformed at character 11"},
      {"2024-01-01", "cut short"},
      {"00:00:00Z", "malformed at character 3"},
      {"24-01-01T00:00:00Z", "malformed at character 3"},
      {"12024-01-01T00:00:00Z", "malformed at character 5"},
      {"-2024-01-01T00:00:00Z", "malformed at character 1"},
      {"+2024-01-01T00:00:00Z", "malformed at character 1"},
      {"2024-1-01T00:00:00Z", "malformed at character 7"},
      {"2024-01-1T00:00:00Z", "malformed at character 10"},
      {"20240101T000000Z", "malformed at character 5"},
      {"2024-01-01T0:00:00Z", "malformed at character 13"},
      {"2024-01-01T00:00Z", "malformed at character 17"},
      {"2024-01-01T00:00:00.Z", "malformed at character 21"},
      {"2024-01-01T00:00:00.", "cut short"},
      {"2024-01-01T00:00:00,5Z", "malformed at character 20"},
      {"2024-01-01T00:00:00.-5Z", "malformed at character 21"},
      {"2024-01-01T00:00:00.5.5Z", "malformed at character 22"},
      {"2024-01-01T00:00:00+1:00", "malformed at character 22"},
      {"2024-01-01T00:00:00+0100", "malformed at character 23"},
      {"2024-01-01T00:00:00+01", "cut short"},
      {"2024-01-01T00:00:00+", "cut short"},
      {"2024-01-01T00:00:00+01:00Z", "malformed at character 26"},
      {"2024-01-01T00:00:00Z+01:00", "malformed at character 21"},
      {"2024-01-01T-1:00:00Z", "malformed at character 12"},
      {"2024-01-01T00:0x:00Z", "malformed at character 16"},
      {"２024-01-01T00:00:00Z", "malformed at character 1"},
  };
  for (const Row &row : table) {
    EXPECT_EQ(RefusalOf(row.text), Refused(row.text, row.reason));
  }
}

TEST(DateTime, RefusesZeroBytesAndShowsThemAsQuestionMarks) {
  EXPECT_EQ(RefusalOf(std::string_view("2024-01-01T00:00:00Z\0", 21)),
            Refused("2024-01-01T00:00:00Z?", "malformed at character 21"));
  EXPECT_EQ(RefusalOf(std::string_view("2024\0-01-01T00:00:00Z", 21)),
            Refused("2024?-01-01T00:00:00Z", "malformed at character 5"));
}

TEST(DateTime, RefusesEveryPrefixThatIsNotADateTime) {
  const std::string text = "2024-02-29T13:14:15.123456+05:30";
  for (std::size_t length = 0; length < text.size(); ++length) {
    const bool endsAfterSeconds = length == 19;
    const bool endsInFraction = length >= 21 && length <= 26;
    EXPECT_EQ(RefusalOf(text.substr(0, length)).starts_with("accepted"), endsAfterSeconds || endsInFraction) << length;
  }
}

TEST(DateTimeTryParse, ReturnsWhetherItReadADateTime) {
  DateTime date;
  EXPECT_TRUE(DateTime::TryParse("2013-05-07T11:03:01.042+02:00", date));
  EXPECT_EQ("2013-05-07T11:03:01.042+02:00", date.ToString());
  EXPECT_FALSE(DateTime::TryParse("tomorrow", date));
  EXPECT_EQ("2013-05-07T11:03:01.042+02:00", date.ToString());
}

TEST(DateTime, RepeatsAtMost1024BytesOfARefusedText) {
  EXPECT_EQ(RefusalOf(std::string(1'000'000, '7')),
            "\"" + std::string(1024, '7') + "... (998976 more bytes)\" is not a date-time: malformed at character 5");
}

TEST(DateTimeToString, IsReadBackToTheMillisecond) {
  std::mt19937_64 random(2013);
  for (int i = 0; i < 2'000; ++i) {
    const auto utc = static_cast<std::int64_t>(random() % (250'000'000'000ULL * 1'000'000ULL));
    const DateTime value = DateTimeFromUtc(utc, false);
    const DateTime again(value.ToString());
    EXPECT_EQ(again.GetUtcTime(), utc - utc % 1000);
    EXPECT_EQ(again.ToString(), value.ToString());
  }
}

TEST(DateTimeToString, AgreesWithTheSystemsCalendar) {
  for (std::int64_t day = -719'162; day < 2'932'896; day += 97) {
    const std::time_t seconds = day * 86'400 + 3'723;
    std::tm fields{};
    ASSERT_TRUE(::gmtime_r(&seconds, &fields));
    const DateTime value = DateTimeFromUtc(seconds * SECOND, false);
    EXPECT_EQ(value.GetCentury() * 100 + value.GetYear(), fields.tm_year + 1900) << day;
    EXPECT_EQ(value.GetMonth(), fields.tm_mon + 1) << day;
    EXPECT_EQ(value.GetDay(), fields.tm_mday) << day;
    EXPECT_EQ(value.GetDayOfWeek(), fields.tm_wday) << day;
  }
}

TEST(DateTimeToString, PadsEveryField) {
  EXPECT_EQ(DateTime("0007-01-02T03:04:05.005Z").ToString(), "0007-01-02T03:04:05.005Z");
  EXPECT_EQ(DateTime("0007-01-02T03:04:05+01:05").ToString(), "0007-01-02T03:04:05.000+01:05");
}

TEST(DateTimeToString, RoundsDownBeforeTheEpochToo) {
  EXPECT_EQ(DateTimeFromUtc(-1, false).ToString(), "1969-12-31T23:59:59.999Z");
  EXPECT_EQ(DateTimeFromUtc(-1'001, false).ToString(), "1969-12-31T23:59:59.998Z");
  EXPECT_EQ(DateTimeFromUtc(999, false).GetMillisecond(), 0);
}

TEST(DateTimeToShortStringBias, IsTheLetterZForUtc) {
  EXPECT_EQ(DateTimeFromUtc(0, false).ToShortStringBias(), "Z");
  EXPECT_EQ(DateTime("2024-01-01T00:00:00-00:00").ToShortStringBias(), "Z");
}

TEST(DateTimeToShortStringBias, IsTheOffsetOfAnyOtherZone) {
  for (const char *zone : {"+00:01", "-00:01", "+05:30", "-09:45", "+14:00", "-14:00"}) {
    EXPECT_EQ(DateTime("2024-01-01T00:00:00" + std::string(zone)).ToShortStringBias(), zone);
  }
}

TEST(DateTimeFromUtc, SaturatesOutsideTheCalendar) {
  for (const bool local : {false, true}) {
    EXPECT_EQ(DateTimeFromUtc(LOWEST, local).GetUtcTime(), UtcOf("0001-01-01T00:00:00Z"));
    EXPECT_EQ(DateTimeFromUtc(HIGHEST, local).GetUtcTime(), UtcOf("9999-12-31T23:59:59.999999Z"));
  }
  EXPECT_EQ(DateTimeFromUtc(LOWEST, false).ToString(), "0001-01-01T00:00:00.000Z");
  EXPECT_EQ(DateTimeFromUtc(HIGHEST, false).ToString(), "9999-12-31T23:59:59.999Z");
}

/// Sets the process's time zone for one test.
class LocalZone {
public:
  explicit LocalZone(const char *zone) {
    const char *const before = std::getenv("TZ");
    m_before = before ? before : "";
    ::setenv("TZ", zone, 1);
    ::tzset();
  }
  ~LocalZone() {
    m_before.empty() ? ::unsetenv("TZ") : ::setenv("TZ", m_before.c_str(), 1);
    ::tzset();
  }

private:
  std::string m_before;
};

TEST(DateTimeFromUtc, ShowsTheLocalZoneWithItsDaylightSaving) {
  const LocalZone zone("CET-1CEST,M3.5.0,M10.5.0/3");
  const DateTime winter = DateTimeFromUtc(UtcOf("2024-01-15T23:30:00Z"), true);
  const DateTime summer = DateTimeFromUtc(UtcOf("2024-07-15T23:30:00Z"), true);
  EXPECT_EQ(winter.ToString(), "2024-01-16T00:30:00.000+01:00");
  EXPECT_EQ(summer.ToString(), "2024-07-16T01:30:00.000+02:00");
  EXPECT_TRUE(winter == DateTime("2024-01-15T23:30:00Z"));
}

TEST(DateTimeFromUtc, ShowsLocalZonesWestOfUtc) {
  const LocalZone zone("NST3:30");
  EXPECT_EQ(DateTimeFromUtc(0, true).ToString(), "1969-12-31T20:30:00.000-03:30");
}

TEST(DateTimeFromUtc, ShowsUtcWhereTheLocalZoneCannotBeWritten) {
  {
    const LocalZone zone("FAR-14:30");
    EXPECT_EQ(DateTimeFromUtc(0, true).ToString(), "1970-01-01T00:00:00.000Z");
  }
  const LocalZone zone("EAST-5");
  EXPECT_EQ(DateTimeFromUtc(UtcOf("9999-12-31T20:00:00Z"), true).ToString(), "9999-12-31T20:00:00.000Z");
}

TEST(GetUtcDateTime, IsTheSystemsClock) {
  const std::time_t before = std::time(nullptr);
  const DateTime now = GetUtcDateTime();
  const std::time_t after = std::time(nullptr);
  // time() may lag behind the finer clock by a tick.
  EXPECT_GE(now.GetUtcTime(), before * SECOND);
  EXPECT_LE(now.GetUtcTime(), (after + 2) * SECOND);
  EXPECT_EQ(now.GetBiasMinutes(), 0);
}

TEST(DateTime, IsWrittenAsAMessageArgumentAndInLogLines) {
  const DateTime value("2013-05-07T09:03:01.042Z");
  EXPECT_EQ(MessageFormatter::ASPrint("at %1", value), "at 2013-05-07T09:03:01.042Z");
  EXPECT_EQ(DatePrintFormatter::Format(value), "2013-05-07T09:03:01.042Z");
}

} // namespace
} // namespace Tarvel::System
