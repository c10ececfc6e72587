// SPDX-License-Identifier: Apache-2.0
// When and how the token is refreshed, and what failures, clocks and invalidations change.

#include "unit/token_source/source_stage.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

namespace Testing {

using namespace SsoClient;
using namespace std::chrono_literals;
using testing::ElementsAre;

namespace {

const std::string DOWN = "CommunicationException: down";

} // namespace

TEST(TokenSourceRefresh, BeginsByItselfIfACallHasAskedForTheToken) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  EXPECT_EQ(stage.Ask(), "first");
  stage.time.Advance(799s);
  EXPECT_EQ(stage.issuer->Count(), 1U);
  stage.time.Advance(1s);
  EXPECT_EQ(stage.issuer->Count(), 2U);
  stage.issuer->Answer(stage.Token("second", 1000s));
  EXPECT_EQ(stage.Ask(), "second");
  EXPECT_EQ(stage.issuer->Count(), 2U);
}

TEST(TokenSourceRefresh, DoesNotBeginIfNoCallHasAskedSinceTheLastRefresh) {
  const int before = DatedToken::Alive();
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.Advance(900s);
  EXPECT_EQ(stage.issuer->Count(), 1U);
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_EQ(stage.issuer->Count(), 2U) << "now one needs it";
  stage.issuer->Answer(stage.Token("second", 1000s));
  stage.time.Advance(10h);
  EXPECT_EQ(stage.issuer->Count(), 2U);
  EXPECT_EQ(DatedToken::Alive(), before) << "an ended token is released";
  EXPECT_EQ(stage.time.CountTimers(), 0U);
  EXPECT_EQ(stage.Ask(), "waits");
  EXPECT_EQ(stage.issuer->Count(), 3U);
}

TEST(TokenSourceRefresh, BeginsEarlierByTheJitter) {
  SourceStage stage;
  stage.random = 1;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.Advance(700s - 1us);
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_EQ(stage.issuer->Count(), 1U);
  stage.time.Advance(1us);
  EXPECT_EQ(stage.issuer->Count(), 2U);
}

TEST(TokenSourceRefresh, FollowsTheDatesOfATokenThatTheServiceShortened) {
  SourceStage stage;
  stage.Provide(stage.Token("short", 100s));
  stage.time.Advance(80s);
  EXPECT_EQ(stage.Ask(), "short");
  EXPECT_EQ(stage.issuer->Count(), 2U);
  stage.time.Advance(10s);
  EXPECT_EQ(stage.Ask(), "waits") << "the last tenth is the margin";
}

TEST(TokenSourceRefresh, NeverReturnsATokenInItsMargin) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.Advance(970s - 1us);
  EXPECT_EQ(stage.Ask(), "first");
  stage.time.Advance(1us);
  EXPECT_EQ(stage.Ask(), "waits");
  EXPECT_EQ(stage.issuer->Count(), 2U);
}

TEST(TokenSourceRefresh, ReturnsTheOldTokenWhileTheServiceFails) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.Advance(800s);
  EXPECT_EQ(stage.Ask(), "first");
  stage.issuer->Answer(Failure("down"));
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_EQ(stage.issuer->Count(), 2U) << "the back-off forbids another one";
  stage.time.Advance(1s);
  EXPECT_EQ(stage.issuer->Count(), 3U) << "a call has asked since";
}

TEST(TokenSourceRefresh, TriesAgainAfterABackOffThatGrowsAndIsResetBySuccess) {
  SourceStage stage;
  EXPECT_EQ(stage.Ask(), "waits");
  std::size_t requests = 1;
  for (const auto backOff : {1s, 2s, 4s, 8s, 16s, 32s, 60s, 60s}) {
    stage.issuer->Answer(Failure("down"));
    EXPECT_EQ(stage.Ask(), DOWN);
    stage.time.Advance(backOff - 1us);
    EXPECT_EQ(stage.Ask(), DOWN);
    EXPECT_EQ(stage.issuer->Count(), requests);
    stage.time.Advance(1us);
    EXPECT_EQ(stage.issuer->Count(), requests) << "without a token, only a call starts an attempt";
    EXPECT_EQ(stage.Ask(), "waits");
    EXPECT_EQ(stage.issuer->Count(), ++requests);
  }
  stage.issuer->Answer(stage.Token("first", 100s));
  stage.time.Advance(95s);
  EXPECT_EQ(stage.Ask(), "waits");
  stage.issuer->Answer(Failure("down"));
  stage.time.Advance(1s);
  EXPECT_EQ(stage.Ask(), "waits");
}

TEST(TokenSourceRefresh, PassesAFailureToAllCallsThatWait) {
  SourceStage stage;
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  stage.issuer->Answer(Failure("down"));
  EXPECT_THAT(outcomes.Get(), ElementsAre(DOWN, DOWN));
}

TEST(TokenSourceRefresh, KeepsATokenWhenTheServiceIssuesNothingFresher) {
  SourceStage stage;
  const auto first = stage.Token("first", 1000s);
  stage.Provide(first);
  stage.time.Advance(800s);
  EXPECT_EQ(stage.Ask(), "first");
  stage.issuer->Answer(stage.Token("not fresher", 200s));
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_EQ(stage.issuer->Count(), 2U) << "no request all the time";
  stage.time.Advance(1s);
  EXPECT_EQ(stage.issuer->Count(), 3U);
  stage.issuer->Answer(first);
  stage.time.Advance(169s);
  EXPECT_EQ(stage.Ask(), "waits") << "no failure that could be reported";
  stage.issuer->Answer(stage.Token("fresher", 1000s));
  EXPECT_EQ(stage.Ask(), "fresher");
}

TEST(TokenSourceRefresh, RefusesATokenThatHasEnded) {
  SourceStage stage;
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  stage.issuer->Answer(stage.Token("old", -1s));
  EXPECT_THAT(outcomes.Get(),
              ElementsAre("SsoException: The service issued a token that has expired or is about to expire: it ends at "
                          "2024-12-17T23:59:59.000Z, and it is 2024-12-18T00:00:00.000Z"));
}

TEST(TokenSourceRefresh, RenewsAHolderOfKeyTokenThatMayBeRenewed) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s, DatedToken::Kind::RENEWABLE));
  stage.time.Advance(800s);
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_THAT(stage.issuer->GetTexts(), ElementsAre("acquire alice", "renew first 3600"));
  stage.issuer->Answer(stage.Token("renewed", 1000s));
  EXPECT_EQ(stage.Ask(), "renewed");
}

TEST(TokenSourceRefresh, AcquiresWhenARenewalIsRefused) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s, DatedToken::Kind::RENEWABLE));
  stage.time.Advance(800s);
  EXPECT_EQ(stage.Ask(), "first");
  stage.issuer->Answer(Failure("refused"));
  EXPECT_THAT(stage.issuer->GetTexts(), ElementsAre("acquire alice", "renew first 3600", "acquire alice"));
  stage.issuer->Answer(stage.Token("second", 1000s));
  EXPECT_EQ(stage.Ask(), "second");
}

TEST(TokenSourceRefresh, DoesNotRenewATokenThatHasEnded) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s, DatedToken::Kind::RENEWABLE));
  stage.time.SetWallClock(1000s);
  EXPECT_EQ(stage.Ask(), "waits");
  EXPECT_THAT(stage.issuer->GetTexts(), ElementsAre("acquire alice", "acquire alice"));
}

TEST(TokenSourceRefresh, EndsAnAttemptAfterItsTimeAndCancelsTheRequest) {
  SourceStage stage;
  stage.options.attemptTimeout = 5s;
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  stage.time.Advance(5s);
  EXPECT_THAT(outcomes.Get(), ElementsAre("DeadlineExceededException: The deadline passed before the operation ended"));
  EXPECT_EQ(stage.issuer->CountOpen(), 0U);
  stage.issuer->Answer(stage.Token("late", 1000s));
  stage.time.Advance(1s);
  EXPECT_EQ(stage.Ask(), "waits") << "what arrives later is ignored";
}

TEST(TokenSourceRefresh, ReportsThatItsTimeIsOverEvenIfTheRequestEndsAtOnceWhenItIsCancelled) {
  SourceStage stage;
  stage.options.attemptTimeout = 5s;
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  const CancelRegistration registration =
      stage.issuer->GetCancelToken().OnCancel([&] { stage.issuer->Answer(Failure("cancelled")); });
  stage.time.Advance(5s);
  EXPECT_THAT(outcomes.Get(), ElementsAre("DeadlineExceededException: The deadline passed before the operation ended"));
}

TEST(TokenSourceRefresh, DoesNotAcquireWhenARenewalEndsBecauseItsTimeIsOver) {
  SourceStage stage;
  stage.options.attemptTimeout = 5s;
  stage.Provide(stage.Token("first", 1000s, DatedToken::Kind::RENEWABLE));
  stage.time.Advance(800s);
  EXPECT_EQ(stage.Ask(), "first");
  const CancelRegistration registration =
      stage.issuer->GetCancelToken().OnCancel([&] { stage.issuer->Answer(Failure("cancelled")); });
  stage.time.Advance(5s);
  EXPECT_THAT(stage.issuer->GetTexts(), ElementsAre("acquire alice", "renew first 3600"));
}

TEST(TokenSourceRefresh, DoesNotAcquireWhenARenewalEndsAtItsDeadlineBeforeTheTimer) {
  SourceStage stage;
  stage.options.attemptTimeout = 5s;
  stage.Provide(stage.Token("first", 1000s, DatedToken::Kind::RENEWABLE));
  stage.time.Advance(800s);
  stage.time.StartTimer(stage.time.GetSteadyTime() + 5s, [&] { stage.issuer->Answer(Failure("too late")); });
  EXPECT_EQ(stage.Ask(), "first");
  stage.time.Advance(5s);
  EXPECT_THAT(stage.issuer->GetTexts(), ElementsAre("acquire alice", "renew first 3600"));
}

TEST(TokenSourceClock, SetForwardEndsTheTokenAtOnce) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.SetWallClock(24h);
  EXPECT_EQ(stage.Ask(), "waits");
}

TEST(TokenSourceClock, SetForwardDoesNotEndABackOff) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.Advance(800s);
  EXPECT_EQ(stage.Ask(), "first");
  stage.issuer->Answer(Failure("down"));
  stage.time.SetWallClock(10s);
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_EQ(stage.issuer->Count(), 2U);
}

TEST(TokenSourceClock, SetForwardAndBackLeavesTheToken) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.SetWallClock(24h);
  stage.time.SetWallClock(-24h);
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_EQ(stage.issuer->Count(), 1U);
}

TEST(TokenSourceClock, SetBackBeforeTheStartEndsTheTokenAtOnce) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.SetWallClock(-31s);
  EXPECT_EQ(stage.Ask(), "waits");
  stage.issuer->Answer(stage.Token("second", 1000s));
  EXPECT_EQ(stage.Ask(), "second") << "although it ends before the first one";
}

TEST(TokenSourceClock, SetBackDoesNotMakeATokenLiveLonger) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.Advance(600s);
  stage.time.SetWallClock(-600s);
  EXPECT_EQ(stage.Ask(), "first");
  stage.time.Advance(200s);
  EXPECT_EQ(stage.issuer->Count(), 2U) << "it is due by the steady clock";
  stage.time.Advance(170s - 1us);
  EXPECT_EQ(stage.Ask(), "first");
  stage.time.Advance(1us);
  EXPECT_EQ(stage.Ask(), "waits");
}

TEST(TokenSourceInvalidate, AcquiresAtTheNextCallAndDoesNotRenew) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s, DatedToken::Kind::RENEWABLE));
  stage.Source().Invalidate("first");
  EXPECT_EQ(stage.issuer->Count(), 1U);
  EXPECT_EQ(stage.Ask(), "waits");
  EXPECT_THAT(stage.issuer->GetTexts(), ElementsAre("acquire alice", "acquire alice"));
}

TEST(TokenSourceInvalidate, HasNoEffectOnAnotherToken) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.Source().Invalidate("unknown");
  EXPECT_EQ(stage.Ask(), "first");
  EXPECT_EQ(stage.issuer->Count(), 1U);
}

TEST(TokenSourceInvalidate, RefusesTheSameTokenFromTheService) {
  SourceStage stage;
  const auto first = stage.Token("first", 1000s);
  stage.Provide(first);
  stage.Source().Invalidate("first");
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  stage.issuer->Answer(first);
  EXPECT_THAT(outcomes.Get(),
              ElementsAre("SsoException: The service issued a token again that was invalidated: first"));
}

TEST(TokenSourceInvalidate, RemembersTheLastSixteen) {
  SourceStage stage;
  const auto token = stage.Token("0", 1000s);
  for (int number = 0; number < 17; ++number) {
    stage.Source().Invalidate(std::to_string(number));
    stage.Source().Invalidate("16");
  }
  stage.Provide(token);
  EXPECT_EQ(stage.Ask(), "0");
  stage.Source().Invalidate("0");
  EXPECT_EQ(stage.Ask(), "waits");
}

TEST(TokenSourceInvalidate, DuringARenewalMakesTheSourceAcquire) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s, DatedToken::Kind::RENEWABLE));
  stage.time.Advance(800s);
  EXPECT_EQ(stage.Ask(), "first");
  stage.Source().Invalidate("first");
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  stage.issuer->Answer(stage.Token("renewed", 1000s));
  EXPECT_THAT(stage.issuer->GetTexts(), ElementsAre("acquire alice", "renew first 3600", "acquire alice"));
  stage.issuer->Answer(stage.Token("acquired", 1000s));
  EXPECT_THAT(outcomes.Get(), ElementsAre("acquired"));
}

TEST(TokenSourceInvalidate, DuringAnAcquisitionLetsItContinue) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  stage.time.Advance(800s);
  EXPECT_EQ(stage.Ask(), "first");
  stage.Source().Invalidate("first");
  EXPECT_EQ(stage.Ask(), "waits");
  EXPECT_EQ(stage.issuer->Count(), 2U);
  stage.issuer->Answer(stage.Token("second", 1000s));
  EXPECT_EQ(stage.Ask(), "second");
}

} // namespace Testing
