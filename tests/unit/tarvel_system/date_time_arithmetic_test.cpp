// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/date_time.h>

#include "unit/tarvel_system/microseconds.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <limits>
#include <ratio>
#include <string>
#include <type_traits>

namespace Tarvel::System {
namespace {

using Testing::HIGHEST;
using Testing::LOWEST;
using Testing::SECOND;

const DateTime FIRST("0001-01-01T00:00:00Z");
const DateTime LAST("9999-12-31T23:59:59.999999Z");

TEST(SecondsToMicroseconds, Saturates) {
  EXPECT_EQ(SecondsToMicroseconds(0), 0);
  EXPECT_EQ(SecondsToMicroseconds(-3), -3 * SECOND);
  EXPECT_EQ(SecondsToMicroseconds(HIGHEST / SECOND), HIGHEST / SECOND * SECOND);
  EXPECT_EQ(SecondsToMicroseconds(HIGHEST / SECOND + 1), HIGHEST);
  EXPECT_EQ(SecondsToMicroseconds(HIGHEST), HIGHEST);
  EXPECT_EQ(SecondsToMicroseconds(LOWEST / SECOND), LOWEST / SECOND * SECOND);
  EXPECT_EQ(SecondsToMicroseconds(LOWEST / SECOND - 1), LOWEST);
  EXPECT_EQ(SecondsToMicroseconds(LOWEST), LOWEST);
}

TEST(DateTimePlus, MovesThePointInTimeAndKeepsTheZone) {
  const DateTime value("2024-02-28T23:59:59.999999+05:30");
  EXPECT_EQ(value.PlusMicroseconds(1).ToString(), "2024-02-29T00:00:00.000+05:30");
  EXPECT_EQ(value.PlusMicroseconds(-1).GetUtcTime(), value.GetUtcTime() - 1);
  EXPECT_EQ(value.PlusSeconds(86'400).ToString(), "2024-02-29T23:59:59.999+05:30");
  EXPECT_EQ(value.PlusSeconds(-86'400).ToString(), "2024-02-27T23:59:59.999+05:30");
  EXPECT_EQ(value.PlusSeconds(0).GetUtcTime(), value.GetUtcTime());
}

TEST(DateTimePlus, SaturatesAtTheFirstAndTheLastPoint) {
  for (const DateTime &value : {FIRST, DateTime(), LAST}) {
    EXPECT_TRUE(value.PlusMicroseconds(HIGHEST) == LAST) << value.ToString();
    EXPECT_TRUE(value.PlusMicroseconds(LOWEST) == FIRST) << value.ToString();
    EXPECT_TRUE(value.PlusMicroseconds(LAST.MicrosecondsSince(FIRST)) == LAST) << value.ToString();
    EXPECT_TRUE(value.PlusMicroseconds(FIRST.MicrosecondsSince(LAST)) == FIRST) << value.ToString();
    for (const std::int64_t seconds : {HIGHEST, HIGHEST / SECOND + 1, HIGHEST / SECOND}) {
      EXPECT_TRUE(value.PlusSeconds(seconds) == LAST) << value.ToString() << " + " << seconds;
      EXPECT_TRUE(value.PlusSeconds(-seconds) == FIRST) << value.ToString() << " - " << seconds;
      EXPECT_TRUE(value.PlusSeconds(-seconds - 1) == FIRST) << value.ToString() << " - " << seconds << " - 1";
    }
  }
  EXPECT_TRUE(LAST.PlusMicroseconds(1) == LAST);
  EXPECT_EQ(LAST.PlusMicroseconds(-1).GetUtcTime(), LAST.GetUtcTime() - 1);
  EXPECT_TRUE(FIRST.PlusMicroseconds(-1) == FIRST);
  EXPECT_EQ(FIRST.PlusMicroseconds(1).GetUtcTime(), FIRST.GetUtcTime() + 1);
}

TEST(DateTimePlus, ShowsUtcWhereTheZoneWouldLeaveTheCalendar) {
  EXPECT_EQ(DateTime("9999-12-31T23:59:59+05:00").PlusSeconds(1).ToString(), "9999-12-31T19:00:00.000Z");
  EXPECT_EQ(DateTime("0001-01-01T00:00:00-05:00").PlusMicroseconds(-1).ToString(), "0001-01-01T04:59:59.999Z");
}

TEST(DateTimeMicrosecondsSince, IsExactForAnyTwoPoints) {
  EXPECT_EQ(LAST.MicrosecondsSince(FIRST), 315'537'897'600 * SECOND - 1);
  EXPECT_EQ(FIRST.MicrosecondsSince(LAST), 1 - 315'537'897'600 * SECOND);
  EXPECT_EQ(DateTime("2024-01-01T14:00:00+02:00").MicrosecondsSince(DateTime("2024-01-01T12:00:00Z")), 0);
  EXPECT_EQ(DateTime("2024-01-01T12:00:00.000001Z").MicrosecondsSince(DateTime("2024-01-01T12:00:01Z")), 1 - SECOND);
}

template <typename Duration>
std::string TextOf(Duration sinceEpoch) {
  return DateTime::FromTimePoint(std::chrono::time_point<std::chrono::system_clock, Duration>(sinceEpoch)).ToString();
}

template <typename Duration>
std::int64_t MicrosecondsOf(Duration sinceEpoch) {
  return DateTime::FromTimePoint(std::chrono::time_point<std::chrono::system_clock, Duration>(sinceEpoch)).GetUtcTime();
}

TEST(DateTimeToTimePoint, IsTheSamePointInTime) {
  const auto point = DateTime("2013-05-07T11:03:01.042001+02:00").ToTimePoint();
  static_assert(std::is_same_v<decltype(point), const std::chrono::sys_time<std::chrono::microseconds>>);
  EXPECT_EQ(point.time_since_epoch().count(), 1'367'917'381'042'001);
  EXPECT_TRUE(DateTime().ToTimePoint() == std::chrono::system_clock::time_point());
  for (const DateTime &value : {FIRST, DateTimeFromUtc(-1, false), DateTime(), LAST}) {
    EXPECT_TRUE(DateTime::FromTimePoint(value.ToTimePoint()) == value) << value.ToString();
  }
}

TEST(DateTimeFromTimePoint, ReadsAnyDuration) {
  EXPECT_EQ(TextOf(std::chrono::hours(1)), "1970-01-01T01:00:00.000Z");
  EXPECT_EQ(TextOf(std::chrono::duration<std::int16_t, std::ratio<86'400>>(-1)), "1969-12-31T00:00:00.000Z");
  EXPECT_EQ(TextOf(std::chrono::duration<std::uint64_t>(1'367'917'381)), "2013-05-07T09:03:01.000Z");
  EXPECT_EQ(TextOf(std::chrono::duration<double>(0.5)), "1970-01-01T00:00:00.500Z");
  EXPECT_EQ(MicrosecondsOf(std::chrono::duration<std::int64_t, std::ratio<1, 3>>(1)), 333'333);
  EXPECT_EQ(DateTime::FromTimePoint(std::chrono::system_clock::time_point()).GetUtcTime(), 0);
}

TEST(DateTimeFromTimePoint, ReadsLongTimesInFinePeriods) {
  constexpr std::int64_t YEAR_3000_SECONDS = 32'503'680'000;
  EXPECT_EQ(TextOf(std::chrono::duration<std::int64_t, std::ratio<1, 4'294'967'296>>(1'700'000'000 * 4'294'967'296)),
            "2023-11-14T22:13:20.000Z");
  EXPECT_EQ(TextOf(std::chrono::duration<std::int64_t, std::ratio<1, 44'100>>(YEAR_3000_SECONDS * 44'100 + 22'050)),
            "3000-01-01T00:00:00.500Z");
  EXPECT_EQ(TextOf(std::chrono::duration<float>(1e9F)), "2001-09-09T01:46:40.000Z");
  EXPECT_EQ(MicrosecondsOf(std::chrono::duration<std::int64_t, std::pico>::min()), -9'223'372'036'855);
}

TEST(DateTimeFromTimePoint, RoundsDownToAMicrosecond) {
  using std::chrono::nanoseconds;
  EXPECT_EQ(MicrosecondsOf(nanoseconds(999)), 0);
  EXPECT_EQ(MicrosecondsOf(nanoseconds(1'999)), 1);
  EXPECT_EQ(MicrosecondsOf(nanoseconds(-1)), -1);
  EXPECT_EQ(MicrosecondsOf(nanoseconds(-1'000)), -1);
  EXPECT_EQ(MicrosecondsOf(nanoseconds(-1'001)), -2);
  EXPECT_EQ(MicrosecondsOf(nanoseconds::max()), 9'223'372'036'854'775);
  EXPECT_EQ(MicrosecondsOf(nanoseconds::min()), -9'223'372'036'854'776);
  EXPECT_EQ(MicrosecondsOf(std::chrono::duration<double, std::micro>(-0.5)), -1);
}

TEST(DateTimeFromTimePoint, SaturatesOutsideTheCalendar) {
  using std::chrono::microseconds;
  using Years = std::chrono::duration<std::int64_t, std::ratio<31'556'952>>;
  EXPECT_EQ(MicrosecondsOf(microseconds(LAST.GetUtcTime() + 1)), LAST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(microseconds(FIRST.GetUtcTime() - 1)), FIRST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(microseconds::max()), LAST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(microseconds::min()), FIRST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(std::chrono::hours::max()), LAST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(std::chrono::hours::min()), FIRST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(Years::max()), LAST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(Years::min()), FIRST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(std::chrono::duration<std::uint64_t>::max()), LAST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(std::chrono::duration<double>(std::numeric_limits<double>::infinity())), LAST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(std::chrono::duration<double>(-std::numeric_limits<double>::infinity())),
            FIRST.GetUtcTime());
  EXPECT_EQ(MicrosecondsOf(std::chrono::duration<double>(std::numeric_limits<double>::quiet_NaN())),
            FIRST.GetUtcTime());
}

} // namespace
} // namespace Tarvel::System
