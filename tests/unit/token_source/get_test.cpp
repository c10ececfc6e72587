// SPDX-License-Identifier: Apache-2.0
// The outcomes of calls that ask for the token, and when the source sends a request.

#include "unit/token_source/source_stage.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>

namespace Testing {

using namespace SsoClient;
using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(TokenSourceGet, AcquiresAtTheFirstCallAndReturnsTheSameTokenAfterwards) {
  SourceStage stage;
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  EXPECT_THAT(stage.issuer->GetTexts(), ElementsAre("acquire alice"));
  EXPECT_THAT(outcomes.Get(), IsEmpty());
  const auto token = stage.Token("first", 1h);
  stage.issuer->Answer(token);
  EXPECT_THAT(outcomes.Get(), ElementsAre("first"));
  EXPECT_EQ(stage.Source().Get({}), token);
  EXPECT_EQ(stage.issuer->Count(), 1U);
}

TEST(TokenSourceGet, SendsNothingBeforeACallAsks) {
  SourceStage stage;
  stage.Source();
  stage.time.Advance(24h);
  EXPECT_EQ(stage.issuer->Count(), 0U);
}

TEST(TokenSourceGet, JoinsAThousandCallsToOneRequest) {
  SourceStage stage;
  OutcomeList outcomes;
  for (int call = 0; call < 1000; ++call) {
    stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  }
  EXPECT_EQ(stage.issuer->Count(), 1U);
  stage.issuer->Answer(stage.Token("shared", 1h));
  EXPECT_EQ(outcomes.Get(), std::vector<std::string>(1000, "shared"));
  EXPECT_EQ(stage.issuer->Count(), 1U);
}

TEST(TokenSourceGet, ReturnsADueTokenAtOnceAndRefreshesItWithOneRequest) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.Advance(799s);
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_EQ(stage.issuer->Count(), 1U);
  stage.time.Advance(1s);
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_EQ(stage.issuer->Count(), 2U);
  stage.issuer->Answer(stage.Token("second", 1000s));
  EXPECT_EQ(stage.Ask(), "second");
  EXPECT_EQ(stage.issuer->Count(), 2U);
}

TEST(TokenSourceGet, NeedsNoLockForATokenThatCanBeReturned) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.Advance(800s);
  EXPECT_EQ(stage.Ask(), "first");
  int reads = 0;
  stage.whileLocked = [&] {
    std::thread reader([&] {
      EXPECT_EQ(stage.Source().Get({})->GetId(), "first");
      EXPECT_EQ(stage.Ask(), "first");
      ++reads;
    });
    reader.join();
  };
  stage.issuer->Answer(stage.Token("second", 1000s));
  EXPECT_EQ(reads, 1);
  EXPECT_EQ(stage.Ask(), "second");
}

} // namespace Testing
