// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/environment.h>

#include <tarvel/core/string_util.h>
#include <tarvel/system/date_time.h>
#include <tarvel/system/environment.h>

#include <gtest/gtest.h>

#include <limits>
#include <thread>
#include <type_traits>

namespace Tarvel::System {
namespace {

static_assert(std::is_same_v<System::Environment, Tarvel::Environment> &&
                  std::is_same_v<System::ScopedEnvironment, Tarvel::ScopedEnvironment>,
              "the former names still work");

/// Later than the clock of any machine that runs this test.
constexpr std::int64_t YEAR_3000 = 32'503'680'000'000'000;

Environment Clock(std::int64_t now) {
  return {[now] { return now; }, nullptr};
}

TEST(ScopedEnvironment, ReplacesTheClockAndTheUuidSource) {
  const ScopedEnvironment scope({[] { return std::int64_t{1'000'000}; }, [] { return std::string("uuid-1"); }});
  EXPECT_EQ(GetUtcDateTime().ToString(), "1970-01-01T00:00:01.000Z");
  EXPECT_EQ(StringUtil::GenerateUuid(), "uuid-1");
}

TEST(ScopedEnvironment, RestoresTheRealSourcesAtItsEnd) {
  {
    const ScopedEnvironment scope({[] { return std::int64_t{0}; }, [] { return std::string("uuid-1"); }});
  }
  EXPECT_GT(GetUtcDateTime().GetUtcTime(), 0);
  EXPECT_EQ(StringUtil::GenerateUuid().size(), 36U);
}

TEST(ScopedEnvironment, Nests) {
  const ScopedEnvironment outer(Clock(1));
  {
    const ScopedEnvironment inner(Clock(2));
    EXPECT_EQ(GetUtcDateTime().GetUtcTime(), 2);
  }
  EXPECT_EQ(GetUtcDateTime().GetUtcTime(), 1);
}

TEST(ScopedEnvironment, UsesTheRealSourceForAnEmptyFunctionEvenInsideAnotherScope) {
  const ScopedEnvironment outer({[] { return YEAR_3000; }, [] { return std::string("outer"); }});
  const ScopedEnvironment inner{Environment{}};
  EXPECT_LT(GetUtcDateTime().GetUtcTime(), YEAR_3000);
  EXPECT_EQ(StringUtil::GenerateUuid().size(), 36U);
}

TEST(ScopedEnvironment, AppliesToEveryThread) {
  const ScopedEnvironment scope(Clock(42));
  std::int64_t seen = 0;
  std::thread([&] { seen = GetUtcDateTime().GetUtcTime(); }).join();
  EXPECT_EQ(seen, 42);
}

TEST(ScopedEnvironment, ClockSaturatesLikeEveryDateTime) {
  const ScopedEnvironment scope(Clock(std::numeric_limits<std::int64_t>::max()));
  EXPECT_EQ(GetUtcDateTime().ToString(), "9999-12-31T23:59:59.999Z");
}

} // namespace
} // namespace Tarvel::System
