// SPDX-License-Identifier: Apache-2.0

#include "time_text.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <string>

namespace SsoClient::Tool {
namespace {

using Tarvel::System::DateTime;

struct Span {
  std::int64_t seconds;
  const char *text;
};

const Span SPANS[] = {
    {0, "0 s"},
    {1, "1 s"},
    {59, "59 s"},
    {60, "1 min"},
    {61, "1 min 1 s"},
    {3599, "59 min 59 s"},
    {3600, "1 h"},
    {3659, "1 h"},
    {3660, "1 h 1 min"},
    {7 * 3600 + 12 * 60 + 59, "7 h 12 min"},
    {86399, "23 h 59 min"},
    {86400, "1 d"},
    {86400 + 3599, "1 d"},
    {3 * 86400 + 4 * 3600, "3 d 4 h"},
    {100LL * 86400 - 1, "99 d 23 h"},
    {100LL * 86400, "100 d"},
    {101LL * 86400 - 1, "100 d"},
    {-61, "1 min 1 s"},
    {std::numeric_limits<std::int64_t>::max(), "106751991167300 d"},
    {std::numeric_limits<std::int64_t>::min(), "106751991167300 d"},
};

class SpanTextOf : public testing::TestWithParam<Span> {};

TEST_P(SpanTextOf, IsTheTwoLargestUnits) {
  EXPECT_EQ(GetParam().text, SpanText(GetParam().seconds));
}

INSTANTIATE_TEST_SUITE_P(Each, SpanTextOf, testing::ValuesIn(SPANS), [](const auto &span) {
  return "Number" + std::to_string(span.index) + "Of" + std::to_string(std::size(SPANS));
});

TEST(WhenText, HasInOrAgo) {
  const DateTime now("2026-01-01T12:00:00Z");
  EXPECT_EQ("in 7 h 12 min", WhenText(DateTime("2026-01-01T19:12:00Z"), now));
  EXPECT_EQ("3 d 4 h ago", WhenText(DateTime("2025-12-29T08:00:00Z"), now));
  EXPECT_EQ("in 1 s", WhenText(DateTime("2026-01-01T12:00:01Z"), now));
  EXPECT_EQ("1 s ago", WhenText(DateTime("2026-01-01T11:59:59Z"), now));
}

TEST(WhenText, IsNowWithinASecond) {
  const DateTime now("2026-01-01T12:00:00Z");
  EXPECT_EQ("now", WhenText(now, now));
  EXPECT_EQ("now", WhenText(DateTime("2026-01-01T12:00:00.999999Z"), now));
  EXPECT_EQ("now", WhenText(DateTime("2026-01-01T11:59:59.000001Z"), now));
}

TEST(WhenText, IsExactBetweenTheFirstAndTheLastDate) {
  const DateTime first("0001-01-01T00:00:00Z");
  const DateTime last("9999-12-31T23:59:59.999999Z");
  EXPECT_EQ("in 3652058 d", WhenText(last, first));
  EXPECT_EQ("3652058 d ago", WhenText(first, last));
}

TEST(UtcText, ShowsATimeOfAnotherZoneInUtc) {
  EXPECT_EQ("2026-01-01T11:00:00.000Z", UtcText(DateTime("2026-01-01T13:00:00+02:00")));
}

} // namespace
} // namespace SsoClient::Tool
