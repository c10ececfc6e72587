// SPDX-License-Identifier: Apache-2.0

#include "client/refresh_times.h"

#include "unit/token_source/dated_token.h"

#include <gtest/gtest.h>

#include <limits>

namespace Testing {

using namespace SsoClient;
using namespace std::chrono_literals;

namespace {

constexpr std::int64_t SECOND = 1'000'000;
constexpr std::int64_t NOW = 1'000'000 * SECOND;

Moment At(std::int64_t system) {
  return {system, TimeSource::SteadyClock::time_point(1000s + std::chrono::microseconds(system - NOW))};
}

RefreshTimes Plan(std::int64_t start, std::int64_t end, bool isIssued = true, double random = 0) {
  return PlanRefresh(DatedToken("a", start, end), At(NOW), isIssued, TokenSourceOptions(), random);
}

} // namespace

TEST(PlanRefresh, IsDueAfterAPartOfTheLifetimeThatTheTokenStates) {
  const RefreshTimes times = Plan(NOW, NOW + 1000 * SECOND);
  EXPECT_FALSE(times.IsDue(At(NOW + 800 * SECOND - 1)));
  EXPECT_TRUE(times.IsDue(At(NOW + 800 * SECOND)));
}

TEST(PlanRefresh, SubtractsUpToTheJitter) {
  EXPECT_EQ(Plan(NOW, NOW + 1000 * SECOND, true, 1).dueAt, NOW + 700 * SECOND);
  EXPECT_EQ(Plan(NOW, NOW + 1000 * SECOND, true, 0.5).dueAt, NOW + 750 * SECOND);
}

TEST(PlanRefresh, KeepsAMarginOfThirtySecondsOrOfATenthOfTheLifetime) {
  EXPECT_EQ(Plan(NOW, NOW + 1000 * SECOND).usableUntil, NOW + 970 * SECOND);
  EXPECT_EQ(Plan(NOW, NOW + 100 * SECOND).usableUntil, NOW + 90 * SECOND);
}

TEST(PlanRefresh, UsesATokenOfAServiceWhoseClockIsAhead) {
  const RefreshTimes times = Plan(NOW + 60 * SECOND, NOW + 1060 * SECOND);
  EXPECT_TRUE(times.IsUsable(At(NOW)));
  EXPECT_EQ(times.dueAt, NOW + 860 * SECOND);
}

TEST(PlanRefresh, DoesNotMakeANewTokenOfASlowServiceDueAtOnce) {
  EXPECT_EQ(Plan(NOW - 900 * SECOND, NOW + 100 * SECOND).dueAt, NOW + 70 * SECOND) << "then its margin begins";
  EXPECT_EQ(Plan(NOW - 500 * SECOND, NOW + 500 * SECOND).dueAt, NOW + 400 * SECOND);
  EXPECT_EQ(Plan(NOW - 900 * SECOND, NOW + 100 * SECOND, false).dueAt, NOW - 100 * SECOND) << "in a file it is old";
}

TEST(PlanRefresh, EndsOnEitherClock) {
  const RefreshTimes times = Plan(NOW, NOW + 1000 * SECOND);
  Moment setBack = At(NOW + 970 * SECOND);
  setBack.system = NOW + 10;
  EXPECT_FALSE(times.IsUsable(setBack));
  Moment setForward = At(NOW + 10);
  setForward.system = NOW + 970 * SECOND;
  EXPECT_FALSE(times.IsUsable(setForward));
  setForward.system -= 1;
  EXPECT_TRUE(times.IsUsable(setForward));
  EXPECT_TRUE(times.IsDue(setForward));
}

TEST(PlanRefresh, AllowsTheClockToBeSetBackByTheMargin) {
  const RefreshTimes times = Plan(NOW, NOW + 1000 * SECOND);
  EXPECT_TRUE(times.IsUsable(At(NOW - 30 * SECOND)));
  EXPECT_FALSE(times.IsUsable(At(NOW - 30 * SECOND - 1)));
}

TEST(PlanRefresh, MakesATokenThatEndsBeforeItsStartUnusable) {
  const RefreshTimes times = Plan(NOW, NOW - 1);
  EXPECT_FALSE(times.IsUsable(At(NOW)));
}

TEST(PlanRefresh, DoesNotOverflowForATokenOfTheYear9999) {
  const RefreshTimes times = Plan(-62'135'596'800 * SECOND, 253'402'300'799 * SECOND);
  EXPECT_TRUE(times.IsUsable(At(NOW)));
  EXPECT_GT(times.steadyUntil, At(NOW).steady + 24h * 365 * 9);
  EXPECT_LT(times.steadyUntil, At(NOW).steady + 24h * 365 * 11);
}

TEST(GetBackOff, DoublesUpToTheLongest) {
  const TokenSourceOptions options;
  EXPECT_EQ(GetBackOff(1, options, 0), 1s);
  EXPECT_EQ(GetBackOff(2, options, 0), 2s);
  EXPECT_EQ(GetBackOff(6, options, 0), 32s);
  EXPECT_EQ(GetBackOff(7, options, 0), 60s);
  EXPECT_EQ(GetBackOff(std::numeric_limits<int>::max(), options, 0), 60s);
}

TEST(GetBackOff, SubtractsUpToTheHalf) {
  EXPECT_EQ(GetBackOff(1, TokenSourceOptions(), 1), 500ms);
  EXPECT_EQ(GetBackOff(7, TokenSourceOptions(), 0.5), 45s);
}

} // namespace Testing
