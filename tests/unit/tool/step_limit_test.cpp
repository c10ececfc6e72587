// SPDX-License-Identifier: Apache-2.0

#include "step_limit.h"

#include <gtest/gtest.h>

namespace SsoClient::Tool {
namespace {

using std::chrono::microseconds;
using std::chrono::milliseconds;
using std::chrono::seconds;

TEST(StepLimit, LeavesTimeToShowTheResults) {
  EXPECT_EQ(milliseconds(4500), StepLimit(microseconds(seconds(5)), seconds(5)));
  EXPECT_EQ(milliseconds(400), StepLimit(microseconds(milliseconds(800)), milliseconds(800)));
}

TEST(StepLimit, IsShorterAfterEarlierStepsHaveTakenTime) {
  EXPECT_EQ(milliseconds(1500), StepLimit(microseconds(seconds(5)), seconds(2)));
  EXPECT_EQ(milliseconds(300), StepLimit(microseconds(milliseconds(800)), milliseconds(700)));
}

TEST(StepLimit, IsAMillisecondWhenNoTimeIsLeft) {
  EXPECT_EQ(milliseconds(1), StepLimit(microseconds(seconds(5)), milliseconds(500)));
  EXPECT_EQ(milliseconds(1), StepLimit(microseconds(seconds(5)), milliseconds(-1)));
}

TEST(StepLimit, IsTenSecondsWithoutATimeOut) {
  EXPECT_EQ(seconds(10), StepLimit(boost::none, seconds(0)));
}

} // namespace
} // namespace SsoClient::Tool
