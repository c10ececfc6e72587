// SPDX-License-Identifier: Apache-2.0

#include "proof/time_window.h"

#include "proof/message_sinks.h"
#include "support/throws_message.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

namespace {

using namespace SsoClient;
using Tarvel::InvalidArgumentException;
using Tarvel::System::DateTime;

constexpr std::int64_t LARGEST = std::numeric_limits<std::int64_t>::max();
constexpr TimeWindow MINUTES{60, 300};
const Place NOWHERE(nullptr);

DateTime At(const char *text) {
  return DateTime(text);
}

void CheckCreatedAt(const char *created, const char *now, const TimeWindow &window = MINUTES) {
  CheckCreation(At(created), window, At(now), NOWHERE, ThrowingMessageSinks().time);
}

void CheckExpiryAt(const char *expires, const char *now, const TimeWindow &window = MINUTES) {
  CheckExpiry(At(expires), window, At(now), NOWHERE, ThrowingMessageSinks().time);
}

TEST(CheckCreation, AcceptsMessagesWithinTheAgeAndTheTolerance) {
  EXPECT_NO_THROW(CheckCreatedAt("2026-01-01T00:00:00Z", "2026-01-01T00:00:00Z"));
  EXPECT_NO_THROW(CheckCreatedAt("2026-01-01T00:01:00Z", "2026-01-01T00:00:00Z"));
  EXPECT_NO_THROW(CheckCreatedAt("2026-01-01T00:00:00.000001Z", "2026-01-01T00:06:00Z"));
}

TEST(CheckCreation, RefusesMessagesFromTheFuture) {
  EXPECT_THROWS_MESSAGE(CheckCreatedAt("2026-01-01T00:01:00.000001Z", "2026-01-01T00:00:00Z"), StaleMessageException,
                        "The message was created in the future: 2026-01-01T00:01:00.000Z");
}

TEST(CheckCreation, RefusesMessagesThatAreTooOld) {
  EXPECT_THROWS_MESSAGE(CheckCreatedAt("2026-01-01T00:00:00Z", "2026-01-01T00:06:00Z"), StaleMessageException,
                        "The message is too old. It was created at: 2026-01-01T00:00:00.000Z");
}

TEST(CheckCreation, AcceptsEveryAgeIfTheNumbersAreTheLargest) {
  for (const TimeWindow &window : {TimeWindow{LARGEST, LARGEST}, TimeWindow{0, LARGEST}, TimeWindow{LARGEST, 1}}) {
    EXPECT_NO_THROW(CheckCreatedAt("0001-01-01T00:00:00Z", "9999-12-31T23:59:59Z", window));
  }
}

TEST(CheckExpiry, AcceptsUntilTheToleranceHasPassed) {
  EXPECT_NO_THROW(CheckExpiryAt("2026-01-01T00:00:00Z", "2026-01-01T00:00:59.999999Z"));
  EXPECT_THROWS_MESSAGE(CheckExpiryAt("2026-01-01T00:00:00Z", "2026-01-01T00:01:00Z"), StaleMessageException,
                        "The message has expired at: 2026-01-01T00:00:00.000Z");
}

TEST(GetStaleTime, IsTheFirstMomentAtWhichTheMessageIsRefused) {
  EXPECT_EQ(At("2026-01-01T00:06:00Z"), GetStaleTime(At("2026-01-01T00:00:00Z"), boost::none, MINUTES));
  EXPECT_EQ(At("2026-01-01T00:03:00Z"), GetStaleTime(At("2026-01-01T00:00:00Z"), At("2026-01-01T00:02:00Z"), MINUTES));
  EXPECT_EQ(At("2026-01-01T00:06:00Z"), GetStaleTime(At("2026-01-01T00:00:00Z"), At("2026-01-02T00:00:00Z"), MINUTES));
}

TEST(GetStaleTime, IsTheLastDateIfTheNumbersAreTheLargest) {
  EXPECT_EQ(At("9999-12-31T23:59:59.999999Z"),
            GetStaleTime(At("2026-01-01T00:00:00Z"), boost::none, TimeWindow{LARGEST, LARGEST}));
}

TEST(RequireTimeWindow, RefusesNegativeTolerances) {
  EXPECT_NO_THROW(RequireTimeWindow({0, 1}, "Options"));
  EXPECT_THROWS_MESSAGE(RequireTimeWindow({-1, 300}, "Options"), InvalidArgumentException,
                        "Invalid argument : Options::clockToleranceSec must not be negative, but is -1");
}

TEST(RequireTimeWindow, RefusesAgesThatAreNotPositive) {
  EXPECT_THROWS_MESSAGE(RequireTimeWindow({60, 0}, "Options"), InvalidArgumentException,
                        "Invalid argument : Options::maxAgeSec must be positive, but is 0");
}

} // namespace
