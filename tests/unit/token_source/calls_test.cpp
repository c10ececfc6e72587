// SPDX-License-Identifier: Apache-2.0
// How waiting calls end: deadline, cancellation, destruction, executors, threads.

#include "support/process_resources.h"
#include "support/recorded_log.h"
#include "support/rendezvous.h"
#include "support/throws_message.h"
#include "unit/token_source/source_stage.h"

#include <ssoclient/client/exceptions.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <thread>

namespace Testing {

using namespace SsoClient;
using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

const std::string CANCELLED = "CancelledException: The operation was cancelled";
const std::string LATE = "DeadlineExceededException: The deadline passed before the operation ended";
const std::string DESTROYED = "CancelledException: The operation was cancelled because its token source was destroyed";

} // namespace

TEST(TokenSourceCall, EndsAtItsDeadlineAndLeavesTheOthersAndTheRequest) {
  SourceStage stage;
  OutcomeList late;
  OutcomeList other;
  GetOptions options;
  options.deadline = stage.time.GetSteadyTime() + 5s;
  stage.Source().GetAsync(options, CancelToken(), late.MakeCallback());
  stage.Source().GetAsync({}, CancelToken(), other.MakeCallback());
  stage.time.Advance(5s - 1us);
  EXPECT_THAT(late.Get(), IsEmpty());
  stage.time.Advance(1us);
  EXPECT_THAT(late.Get(), ElementsAre(LATE));
  EXPECT_THAT(other.Get(), IsEmpty());
  EXPECT_EQ(stage.issuer->CountOpen(), 1U);
  stage.issuer->Answer(stage.Token("first", 1000s));
  EXPECT_THAT(other.Get(), ElementsAre("first"));
  EXPECT_THAT(late.Get(), ElementsAre(LATE));
}

TEST(TokenSourceCall, IsCancelledByEitherOfItsTokensAndTheOthersContinue) {
  SourceStage stage;
  const CancelSource cancel;
  OutcomeList first;
  OutcomeList second;
  OutcomeList other;
  GetOptions options;
  options.cancelToken = cancel.GetToken();
  stage.Source().GetAsync(options, CancelToken(), first.MakeCallback());
  stage.Source().GetAsync({}, cancel.GetToken(), second.MakeCallback());
  stage.Source().GetAsync({}, CancelToken(), other.MakeCallback());
  cancel.Cancel();
  EXPECT_THAT(first.Get(), ElementsAre(CANCELLED));
  EXPECT_THAT(second.Get(), ElementsAre(CANCELLED));
  stage.issuer->Answer(stage.Token("first", 1000s));
  EXPECT_THAT(other.Get(), ElementsAre("first"));
  EXPECT_THAT(first.Get(), ElementsAre(CANCELLED));
}

TEST(TokenSourceCall, ThatIsCancelledOrLateAtItsStartAsksForNothing) {
  SourceStage stage;
  GetOptions late;
  late.deadline = stage.time.GetSteadyTime();
  EXPECT_EQ(stage.Ask(late), LATE);
  const CancelSource cancel;
  cancel.Cancel();
  GetOptions both = late;
  both.cancelToken = cancel.GetToken();
  EXPECT_EQ(stage.Ask(both), CANCELLED);
  EXPECT_EQ(stage.issuer->Count(), 0U);
  stage.Provide(stage.Token("first", 1000s));
  EXPECT_EQ(stage.Ask(late), LATE) << "even if there is a token";
  EXPECT_THROWS_MESSAGE(stage.Source().Get(late), DeadlineExceededException,
                        "The deadline passed before the operation ended");
  EXPECT_THROWS_MESSAGE(stage.Source().Get(both), CancelledException, "The operation was cancelled");
}

TEST(TokenSourceCall, LeavesNoTimerWhenItEnds) {
  SourceStage stage;
  GetOptions options;
  options.deadline = stage.time.GetSteadyTime() + 5s;
  EXPECT_EQ(stage.Ask(options), "waits");
  EXPECT_EQ(stage.time.CountTimers(), 2U) << "its own and that of the attempt";
  stage.issuer->Answer(stage.Token("first", 1000s));
  EXPECT_EQ(stage.time.CountTimers(), 1U) << "that of the token";
}

TEST(TokenSourceCall, ThatCannotStartItsTimerThrowsAndDoesNotCallBack) {
  SourceStage stage;
  EXPECT_EQ(stage.Ask(), "waits");
  OutcomeList outcomes;
  GetOptions options;
  options.deadline = stage.time.GetSteadyTime() + 5s;
  stage.time.RefuseTimers(true);
  EXPECT_THROWS_MESSAGE(stage.Source().GetAsync(options, CancelToken(), outcomes.MakeCallback()),
                        Tarvel::InvalidStateException, "There is no thread for timers");
  stage.time.RefuseTimers(false);
  stage.issuer->Answer(stage.Token("first", 1000s));
  EXPECT_THAT(outcomes.Get(), IsEmpty());
  EXPECT_EQ(stage.Ask(), "first");
}

TEST(TokenSourceCall, FailsWithAnAttemptThatCannotStart) {
  SourceStage stage;
  stage.time.RefuseTimers(true);
  EXPECT_EQ(stage.Ask(), "another: There is no thread for timers");
  stage.time.RefuseTimers(false);
  stage.time.Advance(1s);
  EXPECT_EQ(stage.Ask(), "waits");
}

TEST(TokenSourceCall, EndsWhenTheSourceIsDestroyedAndTheRequestIsCancelled) {
  SourceStage stage;
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  stage.Close();
  EXPECT_THAT(outcomes.Get(), ElementsAre(DESTROYED, DESTROYED));
  EXPECT_EQ(stage.issuer->CountOpen(), 0U);
  EXPECT_EQ(stage.time.CountTimers(), 0U);
  stage.issuer->Answer(stage.Token("late", 1000s));
  EXPECT_THAT(outcomes.Get(), ElementsAre(DESTROYED, DESTROYED));
}

TEST(TokenSourceCall, WaitsOnItsThreadForTheOutcome) {
  SourceStage stage;
  stage.Source();
  std::shared_ptr<const SamlToken> received;
  std::thread caller([&] { received = stage.Source().Get({}); });
  while (stage.issuer->Count() == 0) {
    std::this_thread::yield();
  }
  const auto token = stage.Token("first", 1000s);
  stage.issuer->Answer(token);
  caller.join();
  EXPECT_EQ(received, token);
}

TEST(TokenSourceCall, ThatWaitsEndsWhenTheSourceIsDestroyed) {
  SourceStage stage;
  // Keeps the exception until the thread has ended: ThreadSanitizer does not see the count of its references.
  boost::optional<TokenOutcome> kept;
  stage.Source().GetAsync({}, CancelToken(), [&](const TokenOutcome &outcome) { kept = outcome; });
  GetOptions options;
  options.deadline = stage.time.GetSteadyTime() + 5s;
  std::thread caller([&] {
    EXPECT_THROWS_MESSAGE(stage.Source().Get(options), CancelledException,
                          "The operation was cancelled because its token source was destroyed");
  });
  while (stage.time.CountTimers() < 2) { // one of the attempt, and one of the call, which then waits
    std::this_thread::yield();
  }
  stage.Source().Close();
  caller.join();
}

TEST(TokenSourceCall, SetsAFutureWithoutTheExecutor) {
  SourceStage stage;
  stage.options.executor = [](const std::function<void()> &) { ADD_FAILURE() << "the executor was used"; };
  std::future<std::shared_ptr<const SamlToken>> future = stage.Source().GetFuture({});
  const auto token = stage.Token("first", 1000s);
  stage.issuer->Answer(token);
  EXPECT_EQ(future.get(), token);
  stage.Source().Invalidate("first");
  future = stage.Source().GetFuture({});
  stage.issuer->Answer(Failure("down"));
  EXPECT_THROWS_MESSAGE(future.get(), CommunicationException, "down");
}

TEST(TokenSourceCall, CallsBackOnItsExecutorEvenIfThereIsAlreadyAToken) {
  SourceStage stage;
  stage.Provide(stage.Token("first", 1000s));
  std::deque<std::function<void()>> queue;
  OutcomeList outcomes;
  GetOptions options;
  options.executor = [&](std::function<void()> function) { queue.push_back(std::move(function)); };
  stage.Source().GetAsync(options, CancelToken(), outcomes.MakeCallback());
  EXPECT_THAT(outcomes.Get(), IsEmpty());
  ASSERT_EQ(queue.size(), 1U);
  queue.front()();
  EXPECT_THAT(outcomes.Get(), ElementsAre("first"));
}

TEST(TokenSourceCall, CallsBackOnAThreadOfTheLibraryWhenTheExecutorRefuses) {
  SourceStage stage;
  stage.options.executor = [](const std::function<void()> &) { throw std::runtime_error("the loop has ended"); };
  stage.Source();
  const RecordedLog log;
  EventCount called;
  stage.Source().GetAsync({}, CancelToken(), [&](const TokenOutcome &outcome) {
    EXPECT_EQ(DescribeOutcome(outcome), "first");
    called.Add();
  });
  const auto token = stage.Token("first", 1000s);
  stage.issuer->Answer(token);
  EXPECT_TRUE(called.WaitFor(1));
  EXPECT_THAT(log.Lines(), ElementsAre("SsoClient 8 An executor threw runtime_error: the loop has ended"));
  stage.Close();
  EXPECT_TRUE(Eventually([&] { return token.use_count() == 1; })) << "the thread has released its token, too";
}

TEST(TokenSourceCall, SurvivesACallbackThatThrows) {
  SourceStage stage;
  const RecordedLog log;
  stage.Source().GetAsync({}, CancelToken(),
                          [](const TokenOutcome &) { throw std::runtime_error("the callback failed"); });
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  stage.issuer->Answer(stage.Token("first", 1000s));
  EXPECT_THAT(outcomes.Get(), ElementsAre("first"));
  EXPECT_THAT(log.Lines(), ElementsAre("SsoClient 8 A callback threw runtime_error: the callback failed"));
}

TEST(TokenSourceCall, MayAskAgainWithinItsCallback) {
  SourceStage stage;
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), [&](const TokenOutcome &) {
    stage.Source().Invalidate("first");
    stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  });
  stage.issuer->Answer(stage.Token("first", 1000s));
  stage.issuer->Answer(stage.Token("second", 1000s));
  EXPECT_THAT(outcomes.Get(), ElementsAre("second"));
}

TEST(TokenSourceOnChange, CallsTheFunctionsInOrderWithEachNewToken) {
  SourceStage stage;
  std::vector<std::string> calls;
  const auto first = stage.Source().OnChange([&](const auto &token) { calls.push_back("a " + token->GetId()); });
  auto second = stage.Source().OnChange([&](const auto &token) { calls.push_back("b " + token->GetId()); });
  stage.Provide(stage.Token("first", 1000s));
  EXPECT_THAT(calls, ElementsAre("a first", "b first"));
  stage.Source().Invalidate("first");
  second = nullptr;
  stage.Provide(stage.Token("second", 1000s));
  EXPECT_THAT(calls, ElementsAre("a first", "b first", "a second"));
}

TEST(TokenSourceOnChange, KeepsTheOrderIfACallbackGetsTheNextToken) {
  SourceStage stage;
  std::vector<std::string> calls;
  const auto registration = stage.Source().OnChange([&](const auto &token) { calls.push_back(token->GetId()); });
  stage.Source().GetAsync({}, CancelToken(), [&](const TokenOutcome &outcome) {
    stage.Source().Invalidate(outcome.Get()->GetId());
    stage.Provide(stage.Token("second", 1000s));
  });
  stage.issuer->Answer(stage.Token("first", 1000s));
  EXPECT_THAT(calls, ElementsAre("first", "second"));
}

TEST(TokenSourceOnChange, CallsNothingForATokenThatIsNotFresher) {
  SourceStage stage;
  int calls = 0;
  const auto registration = stage.Source().OnChange([&](const auto &) { ++calls; });
  stage.Provide(stage.Token("first", 1000s));
  stage.time.Advance(800s);
  EXPECT_EQ(stage.Ask(), "first");
  stage.issuer->Answer(stage.Token("not fresher", 200s));
  EXPECT_EQ(calls, 1);
}

TEST(TokenSourceOnChange, AllowsAFunctionToRemoveItselfAndOthers) {
  SourceStage stage;
  std::vector<std::string> calls;
  std::shared_ptr<void> second;
  std::shared_ptr<void> first = stage.Source().OnChange([&](const auto &) {
    calls.emplace_back("first");
    first = nullptr;
    second = nullptr;
  });
  second = stage.Source().OnChange([&](const auto &) { calls.emplace_back("second"); });
  stage.Provide(stage.Token("a", 1000s));
  stage.Source().Invalidate("a");
  stage.Provide(stage.Token("b", 1000s));
  EXPECT_THAT(calls, ElementsAre("first"));
}

TEST(TokenSourceOnChange, ContinuesAfterAFunctionThatThrows) {
  SourceStage stage;
  const RecordedLog log;
  int calls = 0;
  const auto first = stage.Source().OnChange([](const auto &) { throw std::runtime_error("it failed"); });
  const auto second = stage.Source().OnChange([&](const auto &) { ++calls; });
  stage.Provide(stage.Token("a", 1000s));
  EXPECT_EQ(calls, 1);
  EXPECT_EQ(log.Lines().size(), 1U);
}

TEST(TokenSourceOnChange, MakesOneCallAtATimeOnTheExecutor) {
  SourceStage stage;
  std::deque<std::function<void()>> queue;
  GetOptions here;
  here.executor = [](const std::function<void()> &function) { function(); };
  stage.options.executor = [&](std::function<void()> function) { queue.push_back(std::move(function)); };
  std::vector<std::string> calls;
  const auto registration = stage.Source().OnChange([&](const auto &token) { calls.push_back(token->GetId()); });
  for (const std::string id : {"a", "b", "c"}) {
    EXPECT_EQ(stage.Ask(here), "waits");
    stage.issuer->Answer(stage.Token(id, 1000s));
    stage.Source().Invalidate(id);
  }
  EXPECT_EQ(queue.size(), 1U);
  for (; !queue.empty(); queue.pop_front()) {
    queue.front()();
  }
  EXPECT_THAT(calls, ElementsAre("a", "b", "c"));
}

TEST(TokenSourceOnChange, CallsNothingMoreWhenTheSourceIsDestroyed) {
  SourceStage stage;
  std::deque<std::function<void()>> queue;
  GetOptions here;
  here.executor = [](const std::function<void()> &function) { function(); };
  stage.options.executor = [&](std::function<void()> function) { queue.push_back(std::move(function)); };
  const auto registration = stage.Source().OnChange([](const auto &) { ADD_FAILURE() << "it was called"; });
  EXPECT_EQ(stage.Ask(here), "waits");
  stage.issuer->Answer(stage.Token("a", 1000s));
  stage.Close();
  ASSERT_EQ(queue.size(), 1U);
  queue.front()();
}

} // namespace Testing
