// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/client/cancellation.h>

#include "support/recorded_log.h"
#include "support/rendezvous.h"
#include "support/sanitized.h"
#include "support/throws_message.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <type_traits>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using Testing::EventCount;
using Testing::Gate;
using Testing::RecordedLog;

static_assert(!std::is_copy_constructible_v<CancelRegistration> && !std::is_copy_assignable_v<CancelRegistration>);
static_assert(std::is_nothrow_move_constructible_v<CancelRegistration>);
static_assert(std::is_nothrow_move_assignable_v<CancelRegistration>);
static_assert(sizeof(CancelToken) == sizeof(std::shared_ptr<void>));

TEST(CancelToken, WithoutASourceIsNeverCancelled) {
  const CancelToken token;
  EXPECT_FALSE(token.CanBeCancelled());
  EXPECT_FALSE(token.IsCancelled());
  int calls = 0;
  const CancelRegistration registration = token.OnCancel([&calls] { ++calls; });
  EXPECT_EQ(calls, 0);
}

TEST(CancelToken, IsCancelledByItsSource) {
  const CancelSource source;
  const CancelToken token = source.GetToken();
  EXPECT_TRUE(token.CanBeCancelled());
  EXPECT_FALSE(token.IsCancelled());
  EXPECT_FALSE(source.IsCancelled());
  source.Cancel();
  EXPECT_TRUE(token.IsCancelled());
  EXPECT_TRUE(source.IsCancelled());
  EXPECT_TRUE(source.GetToken().IsCancelled());
}

TEST(CancelToken, KeepsItsStateWhenItsSourceIsDestroyed) {
  auto source = std::make_unique<CancelSource>();
  const CancelToken token = source->GetToken();
  source->Cancel();
  source.reset();
  EXPECT_TRUE(token.IsCancelled());
}

TEST(CancelSource, CancelsTheTokensOfItsCopies) {
  const CancelSource source;
  const CancelSource copy = source;
  const CancelToken token = copy.GetToken();
  source.Cancel();
  EXPECT_TRUE(token.IsCancelled());
}

TEST(CancelSource, RemainsUsableWhenItIsMoved) {
  CancelSource source;
  const CancelSource moved = std::move(source);
  source.Cancel(); // NOLINT(bugprone-use-after-move): this is the promise
  EXPECT_TRUE(moved.IsCancelled());
}

TEST(OnCancel, CallsTheFunctionsOnceInTheOrderOfRegistration) {
  const CancelSource source;
  std::string calls;
  const CancelRegistration first = source.GetToken().OnCancel([&calls] { calls += '1'; });
  const CancelRegistration second = source.GetToken().OnCancel([&calls] { calls += '2'; });
  const CancelRegistration third = source.GetToken().OnCancel([&calls] { calls += '3'; });
  EXPECT_EQ(calls, "");
  source.Cancel();
  EXPECT_EQ(calls, "123");
  source.Cancel();
  EXPECT_EQ(calls, "123");
}

TEST(OnCancel, CallsTheFunctionAtOnceWhenItIsCancelledAlready) {
  const CancelSource source;
  source.Cancel();
  int calls = 0;
  const CancelRegistration registration = source.GetToken().OnCancel([&calls] { ++calls; });
  EXPECT_EQ(calls, 1);
}

TEST(OnCancel, CallsNoFunctionThatWasRemoved) {
  const CancelSource source;
  std::string calls;
  CancelRegistration first = source.GetToken().OnCancel([&calls] { calls += '1'; });
  CancelRegistration second = source.GetToken().OnCancel([&calls] { calls += '2'; });
  first = CancelRegistration();
  second = source.GetToken().OnCancel([&calls] { calls += '3'; });
  source.Cancel();
  EXPECT_EQ(calls, "3");
}

TEST(OnCancel, RefusesAnEmptyFunction) {
  const CancelSource source;
  EXPECT_THROWS_MESSAGE(const CancelRegistration registration = source.GetToken().OnCancel(nullptr),
                        Tarvel::InvalidArgumentException,
                        "Invalid argument : the function of CancelToken::OnCancel is empty");
  EXPECT_THROWS_MESSAGE(const CancelRegistration registration = CancelToken().OnCancel({}),
                        Tarvel::InvalidArgumentException,
                        "Invalid argument : the function of CancelToken::OnCancel is empty");
}

TEST(OnCancel, FreesAFunctionWithItsRegistration) {
  const CancelSource source;
  auto held = std::make_shared<int>(0);
  const std::weak_ptr<int> watched = held;
  CancelRegistration registration = source.GetToken().OnCancel([held = std::move(held)] {});
  EXPECT_FALSE(watched.expired());
  registration = {};
  EXPECT_TRUE(watched.expired());
}

TEST(OnCancel, FreesWhatAFunctionCapturesWhenItHasBeenCalled) {
  const CancelSource source;
  auto held = std::make_shared<int>(0);
  const std::weak_ptr<int> watched = held;
  const CancelRegistration registration = source.GetToken().OnCancel([held = std::move(held)] {});
  source.Cancel();
  EXPECT_TRUE(watched.expired());
}

TEST(OnCancel, LogsWhatAFunctionThrowsAndCallsTheOthers) {
  const CancelSource source;
  int calls = 0;
  const CancelRegistration first = source.GetToken().OnCancel([] { throw std::logic_error("no"); });
  const CancelRegistration second = source.GetToken().OnCancel([&calls] { ++calls; });
  const RecordedLog log;
  source.Cancel();
  const CancelRegistration late = source.GetToken().OnCancel([] { throw std::logic_error("late"); });
  EXPECT_EQ(calls, 1);
  EXPECT_EQ(log.Lines(),
            (std::vector<std::string>{"SsoClient 8 A function of CancelToken::OnCancel threw logic_error: no",
                                      "SsoClient 8 A function of CancelToken::OnCancel threw logic_error: late"}));
}

TEST(OnCancel, LetsAFunctionCancelAndRegisterAndRemove) {
  auto source = std::make_unique<CancelSource>();
  const CancelToken token = source->GetToken();
  std::string calls;
  CancelRegistration own;
  CancelRegistration other;
  CancelRegistration added;
  own = token.OnCancel([&] {
    calls += '1';
    source->Cancel();
    added = token.OnCancel([&calls] { calls += '2'; });
    other = {};
    own = {};
    source.reset();
  });
  other = token.OnCancel([&calls] { calls += 'x'; });
  const CancelRegistration last = token.OnCancel([&calls] { calls += '3'; });
  source->Cancel();
  EXPECT_EQ(calls, "123");
}

TEST(OnCancel, DoesNotWaitForAFunctionThatRuns) {
  const CancelSource source;
  Gate gate;
  auto held = std::make_shared<int>(7);
  const std::weak_ptr<int> watched = held;
  int seen = 0;
  CancelRegistration registration = source.GetToken().OnCancel([&gate, &seen, held = std::move(held)] {
    gate.Pass();
    seen = *held;
  });
  std::thread canceller([&source] { source.Cancel(); });
  EXPECT_TRUE(gate.WaitForArrivals(1));
  registration = {};
  source.Cancel(); // the other thread is in it
  const CancelRegistration late = source.GetToken().OnCancel([&seen] { EXPECT_EQ(seen, 0); }); // called at once
  EXPECT_FALSE(watched.expired());
  gate.Open();
  canceller.join();
  EXPECT_EQ(seen, 7);
  EXPECT_TRUE(watched.expired());
}

TEST(OnCancel, TakesAsLongForOneOfManyFunctionsAsForOneOfFew) {
  // With a search through all functions, the test would not end in time.
  constexpr int COUNT = Testing::IS_SANITIZED ? 50'000 : 500'000;
  const CancelSource source;
  int calls = 0;
  std::vector<CancelRegistration> registrations;
  registrations.reserve(COUNT);
  for (int i = 0; i < COUNT; ++i) {
    registrations.push_back(source.GetToken().OnCancel([&calls] { ++calls; }));
  }
  for (std::size_t i = 1; i < registrations.size(); i += 2) {
    registrations[registrations.size() - i] = {};
  }
  source.Cancel();
  EXPECT_EQ(calls, COUNT / 2);
}

/// Registers and removes functions on some threads while another one cancels. Each function counts its calls. The call of
/// a removed function may begin after the removal, if the thread that cancels had already chosen the function.
struct Race {
  CancelSource source;

  void Register() {
    const CancelToken token = source.GetToken();
    std::vector<CancelRegistration> registrations;
    std::vector<std::shared_ptr<const std::atomic<int>>> callsOfKept;
    for (int i = 0; !token.IsCancelled() || i < 100; ++i) {
      const auto calls = std::make_shared<std::atomic<int>>(0);
      CancelRegistration registration =
          token.OnCancel([calls] { EXPECT_EQ(calls->fetch_add(1), 0) << "called twice"; });
      if (i % 2 == 0 && registrations.size() < 100) {
        registrations.push_back(std::move(registration));
        callsOfKept.push_back(calls);
      }
    }
    EXPECT_TRUE(cancelled.WaitFor(1));
    for (const auto &calls : callsOfKept) {
      EXPECT_EQ(*calls, 1);
    }
  }

  EventCount cancelled;
};

TEST(OnCancel, CallsEachFunctionOnceWhileOtherThreadsRegisterAndRemove) {
  for (int round = 0; round < (Testing::IS_SANITIZED ? 20 : 200); ++round) {
    Race race;
    std::vector<std::thread> threads;
    threads.reserve(3);
    for (int i = 0; i < 3; ++i) {
      threads.emplace_back([&race] { race.Register(); });
    }
    race.source.Cancel();
    race.cancelled.Add();
    for (std::thread &thread : threads) {
      thread.join();
    }
  }
}

TEST(AnyOf, IsCancelledWhenEitherTokenIs) {
  for (const int cancelled : {0, 1}) {
    const CancelSource sources[2];
    const CancelToken token = CancelToken::AnyOf(sources[0].GetToken(), sources[1].GetToken());
    int calls = 0;
    const CancelRegistration registration = token.OnCancel([&calls] { ++calls; });
    EXPECT_TRUE(token.CanBeCancelled());
    EXPECT_FALSE(token.IsCancelled());
    sources[cancelled].Cancel();
    EXPECT_TRUE(token.IsCancelled());
    sources[1 - cancelled].Cancel();
    EXPECT_EQ(calls, 1);
  }
}

TEST(AnyOf, IsCancelledAtOnceWhenATokenIsCancelledAlready) {
  const CancelSource cancelled;
  const CancelSource other;
  cancelled.Cancel();
  EXPECT_TRUE(CancelToken::AnyOf(cancelled.GetToken(), other.GetToken()).IsCancelled());
  EXPECT_TRUE(CancelToken::AnyOf(other.GetToken(), cancelled.GetToken()).IsCancelled());
  EXPECT_FALSE(other.IsCancelled());
}

TEST(AnyOf, IsTheOtherTokenWhenOneCannotBeCancelled) {
  const CancelSource source;
  EXPECT_FALSE(CancelToken::AnyOf(CancelToken(), CancelToken()).CanBeCancelled());
  const CancelToken left = CancelToken::AnyOf(source.GetToken(), CancelToken());
  const CancelToken right = CancelToken::AnyOf(CancelToken(), source.GetToken());
  source.Cancel();
  EXPECT_TRUE(left.IsCancelled());
  EXPECT_TRUE(right.IsCancelled());
}

TEST(AnyOf, IsKeptAliveByARegistration) {
  const CancelSource first;
  const CancelSource second;
  int calls = 0;
  const CancelRegistration registration =
      CancelToken::AnyOf(first.GetToken(), second.GetToken()).OnCancel([&calls] { ++calls; });
  second.Cancel();
  EXPECT_EQ(calls, 1);
}

TEST(AnyOf, LeavesNothingWithItsTokensWhenItIsReleased) {
  const CancelSource longLived;
  auto held = std::make_shared<int>(0);
  const std::weak_ptr<int> watched = held;
  {
    const CancelSource request;
    const CancelRegistration registration =
        CancelToken::AnyOf(longLived.GetToken(), request.GetToken()).OnCancel([held = std::move(held)] {});
    EXPECT_FALSE(watched.expired());
  }
  EXPECT_TRUE(watched.expired());
  longLived.Cancel();
}

} // namespace
} // namespace SsoClient
