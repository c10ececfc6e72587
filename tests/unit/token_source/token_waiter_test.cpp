// SPDX-License-Identifier: Apache-2.0

#include "client/token_waiter.h"

#include "support/recorded_log.h"
#include "unit/token_source/source_stage.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Testing {

using namespace SsoClient;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(TokenWaiter, DeliversTheFirstOutcomeOnly) {
  const RecordedLog log;
  OutcomeList outcomes;
  const auto waiter =
      TokenWaiter::Create([](const std::function<void()> &function) { function(); }, outcomes.MakeCallback());
  EXPECT_TRUE(waiter->Deliver(Failure("first")));
  EXPECT_FALSE(waiter->Deliver(Failure("second")));
  EXPECT_FALSE(waiter->Withdraw());
  EXPECT_THAT(outcomes.Get(), ElementsAre("CommunicationException: first"));
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(TokenWaiter, DeliversNothingAfterItWasWithdrawnAndReleasesTheCallback) {
  const auto captured = std::make_shared<int>();
  OutcomeList outcomes;
  {
    const auto waiter = TokenWaiter::Create(nullptr, [captured](const TokenOutcome &) { ADD_FAILURE(); });
    EXPECT_TRUE(waiter->Withdraw());
    EXPECT_FALSE(waiter->Deliver(Failure("late")));
  }
  EXPECT_EQ(captured.use_count(), 1);
}

} // namespace Testing
