// SPDX-License-Identifier: Apache-2.0
// A source in a child of the process that has used it.

#include "support/forked.h"
#include "unit/token_source/source_stage.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Testing {

using namespace SsoClient;
using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(TokenSourceAfterFork, AcquiresInTheChildAndCallsNothingOfTheParentThere) {
  SourceStage stage;
  OutcomeList parents;
  stage.Source().GetAsync({}, CancelToken(), parents.MakeCallback());
  EXPECT_EQ(RunInChild([&] {
              OutcomeList own;
              stage.Source().GetAsync({}, CancelToken(), own.MakeCallback());
              EXPECT_EQ(stage.issuer->Count(), 2U) << "the parent's request does not count here";
              stage.issuer->Answer(stage.Token("of the parent", 1000s));
              EXPECT_THAT(own.Get(), IsEmpty());
              stage.issuer->Answer(stage.Token("own", 1000s));
              EXPECT_THAT(own.Get(), ElementsAre("own"));
              EXPECT_EQ(stage.Ask(), "own");
              EXPECT_THAT(parents.Get(), IsEmpty());
              stage.Close();
              EXPECT_THAT(parents.Get(), IsEmpty());
            }),
            "");
  stage.issuer->Answer(stage.Token("first", 1000s));
  EXPECT_THAT(parents.Get(), ElementsAre("first"));
}

TEST(TokenSourceAfterFork, AsksTheProviderInTheChildWhileItBlocksInTheParent) {
  SourceStage stage;
  std::deque<std::function<void()>> blocked;
  stage.blocking = [&](std::function<void()> function) { blocked.push_back(std::move(function)); };
  EXPECT_EQ(stage.Ask(), "waits");
  EXPECT_EQ(RunInChild([&] {
              EXPECT_EQ(stage.Ask(), "waits");
              ASSERT_EQ(blocked.size(), 2U);
              blocked.back()();
              EXPECT_EQ(stage.issuer->Count(), 1U);
            }),
            "");
}

TEST(TokenSourceAfterFork, ReturnsAndRefreshesTheTokenOfTheParentInTheChild) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  EXPECT_EQ(RunInChild([&] {
              EXPECT_EQ(stage.Ask(), "first");
              stage.time.Advance(800s);
              EXPECT_EQ(stage.Ask(), "first");
              EXPECT_EQ(stage.issuer->Count(), 2U);
              stage.issuer->Answer(stage.Token("second", 1000s));
              EXPECT_EQ(stage.Ask(), "second");
            }),
            "");
  EXPECT_EQ(stage.Ask(), "first");
}

TEST(TokenSourceAfterFork, DoesNotCancelAnAttemptOfTheParentWhenItIsDestroyedInTheChild) {
  SourceStage stage;
  OutcomeList parents;
  stage.Source().GetAsync({}, CancelToken(), parents.MakeCallback());
  EXPECT_EQ(RunInChild([&] {
              stage.Close();
              EXPECT_EQ(stage.issuer->CountOpen(), 1U) << "the child does not cancel it";
              EXPECT_THAT(parents.Get(), IsEmpty());
            }),
            "");
}

TEST(TokenSourceAfterFork, CallsFunctionsOfOnChangeInTheChild) {
  SourceStage stage;
  std::deque<std::function<void()>> queue;
  stage.options.executor = [&](std::function<void()> function) { queue.push_back(std::move(function)); };
  std::vector<std::string> calls;
  const auto registration = stage.Source().OnChange([&](const auto &token) { calls.push_back(token->GetId()); });
  std::future<std::shared_ptr<const SamlToken>> future = stage.Source().GetFuture({});
  stage.issuer->Answer(stage.Token("first", 1000s));
  EXPECT_EQ(RunInChild([&] {
              queue.clear();
              stage.Source().Invalidate("first");
              future = stage.Source().GetFuture({});
              stage.issuer->Answer(stage.Token("second", 1000s));
              ASSERT_EQ(queue.size(), 1U);
              queue.front()();
              EXPECT_THAT(calls, ElementsAre("second"));
            }),
            "");
}

} // namespace Testing
