// SPDX-License-Identifier: Apache-2.0

#include "xml/date_time_text.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

namespace {

using SsoClient::AddMinutesToDate;
using SsoClient::DateTimeFormatter;
using Tarvel::System::DateTime;

constexpr std::int64_t MINUTE = 60'000'000;

std::int64_t OffsetOf(int minutes) {
  const DateTime date("2013-05-07T09:03:01.042Z");
  return AddMinutesToDate(date, minutes).GetUtcTime() - date.GetUtcTime();
}

TEST(AddMinutesToDate, ZeroMinutesIsTheSameTime) {
  const DateTime date("2013-05-07T09:03:01.042Z");
  EXPECT_EQ(date, AddMinutesToDate(date, 0));
}

TEST(AddMinutesToDate, IsExactUpTo35MinutesEitherWay) {
  EXPECT_EQ(MINUTE, OffsetOf(1));
  EXPECT_EQ(10 * MINUTE, OffsetOf(10));
  EXPECT_EQ(35 * MINUTE, OffsetOf(35));
  EXPECT_EQ(-35 * MINUTE, OffsetOf(-35));
}

TEST(AddMinutesToDate, WrapsAbove35Minutes) {
  constexpr std::int64_t RANGE = std::int64_t{1} << 32;
  EXPECT_EQ(36 * MINUTE - RANGE, OffsetOf(36));
  EXPECT_EQ(-36 * MINUTE + RANGE, OffsetOf(-36));
  EXPECT_LT(OffsetOf(36), 0);
}

TEST(AddMinutesToDate, StaysInTheRangeOf32BitsForEveryNumber) {
  for (const int minutes : {std::numeric_limits<int>::max(), std::numeric_limits<int>::min(), 1440, -1440, 71, 72}) {
    EXPECT_LE(OffsetOf(minutes), std::numeric_limits<std::int32_t>::max()) << minutes;
    EXPECT_GE(OffsetOf(minutes), std::numeric_limits<std::int32_t>::min()) << minutes;
  }
}

TEST(AddMinutesToDate, ReturnsUtc) {
  const DateTime date("2013-05-07T11:03:01.042+02:00");
  EXPECT_EQ("2013-05-07T09:13:01.042Z", DateTimeFormatter(AddMinutesToDate(date, 10)));
}

TEST(DateTimeFormatter, PadsEveryFieldWithZeros) {
  EXPECT_EQ("2013-05-07T09:03:01.042Z", DateTimeFormatter(DateTime("2013-05-07T09:03:01.042Z")));
  EXPECT_EQ("2013-01-02T03:04:05.005Z", DateTimeFormatter(DateTime("2013-01-02T03:04:05.005Z")));
  EXPECT_EQ("0987-01-02T03:04:05.005Z", DateTimeFormatter(DateTime("0987-01-02T03:04:05.005Z")));
}

TEST(DateTimeFormatter, AlwaysWritesMilliseconds) {
  EXPECT_EQ("2013-12-31T23:59:59.000Z", DateTimeFormatter(DateTime("2013-12-31T23:59:59Z")));
  EXPECT_EQ("2013-12-31T23:59:59.999Z", DateTimeFormatter(DateTime("2013-12-31T23:59:59.999999Z")));
}

TEST(DateTimeFormatter, EndsWithTheZoneOfTheValue) {
  EXPECT_EQ("2013-05-07T11:03:01.042+02:00", DateTimeFormatter(DateTime("2013-05-07T11:03:01.042+02:00")));
}

} // namespace
