// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/timer.h>

#include "support/allocated_bytes.h"
#include "support/completion.h"
#include "support/process_resources.h"
#include "support/recorded_log.h"
#include "support/rendezvous.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace Tarvel::System {
namespace {

using Testing::DrainIoThreads;
using Testing::EventCount;
using Testing::Eventually;
using Testing::Gate;

using Clock = std::chrono::steady_clock;

constexpr std::chrono::hours LATER{1};

TEST(Timer, CallsItsFunctionOnceAndNotBeforeItsTime) {
  const auto time = Clock::now() + std::chrono::milliseconds(20);
  const auto calls = std::make_shared<EventCount>();
  std::atomic<Clock::time_point> calledAt{};
  const Ref<ScheduledItem> item = StartTimer(time, [calls, &calledAt] {
    calledAt = Clock::now();
    calls->Add();
  });
  ASSERT_TRUE(calls->WaitFor(1));
  EXPECT_GE(calledAt.load(), time);
  EXPECT_TRUE(Eventually([&item] { return item->IsDone(); }));
  ASSERT_TRUE(DrainIoThreads());
  EXPECT_EQ(calls->Get(), 1);
}

TEST(Timer, CallsAFunctionWhoseTimeHasPassedSoonButOnAnotherThread) {
  EventCount calls;
  std::atomic<std::thread::id> thread{};
  StartTimer(Clock::time_point::min(), [&] {
    thread = std::this_thread::get_id();
    calls.Add();
  });
  ASSERT_TRUE(calls.WaitFor(1));
  EXPECT_NE(thread.load(), std::this_thread::get_id());
}

TEST(Timer, CallsInTheOrderOfTheTimesNotOfTheStarts) {
  // A blocked function keeps the others waiting until all are started.
  Gate gate;
  StartTimer(Clock::now(), [&gate] { gate.Pass(); });
  ASSERT_TRUE(gate.WaitForArrivals(1));
  const auto begin = Clock::now() + std::chrono::milliseconds(20);
  std::mutex mutex;
  std::vector<int> order;
  EventCount calls;
  for (const int place : {3, 1, 4, 0, 2}) {
    StartTimer(begin + place * std::chrono::milliseconds(20), [&, place] {
      {
        const std::lock_guard<std::mutex> lock(mutex);
        order.push_back(place);
      }
      calls.Add();
    });
  }
  gate.Open();
  ASSERT_TRUE(calls.WaitFor(5));
  const std::lock_guard<std::mutex> lock(mutex);
  EXPECT_EQ(order, (std::vector<int>{0, 1, 2, 3, 4}));
}

TEST(Timer, IsNotLateWhenALaterOneWasStartedBefore) {
  const Ref<ScheduledItem> later = StartTimer(Clock::now() + LATER, [] {});
  EventCount calls;
  StartTimer(Clock::now() + std::chrono::milliseconds(1), [&calls] { calls.Add(); });
  EXPECT_TRUE(calls.WaitFor(1));
  later->Cancel();
}

TEST(Timer, IsNotLateWhenAnEarlierOneIsCancelled) {
  EventCount calls;
  const Ref<ScheduledItem> earlier = StartTimer(Clock::now() + std::chrono::milliseconds(10), [] {});
  StartTimer(Clock::now() + std::chrono::milliseconds(30), [&calls] { calls.Add(); });
  earlier->Cancel();
  EXPECT_TRUE(calls.WaitFor(1));
}

TEST(Timer, IsDoneAtOnceWhenCancelledAndReleasesWhatItsFunctionCaptures) {
  auto captured = std::make_shared<int>();
  const std::weak_ptr<int> watched = captured;
  std::atomic<int> calls{0};
  const Ref<ScheduledItem> item =
      StartTimer(Clock::now() + LATER, [captured = std::move(captured), &calls] { ++calls; });
  EXPECT_FALSE(item->IsDone());
  item->Cancel();
  EXPECT_TRUE(item->IsDone());
  EXPECT_TRUE(watched.expired());
  item->Cancel();
  EXPECT_EQ(calls, 0);
}

TEST(Timer, IsDoneOnlyWhenItsFunctionHasEndedAndIsReleased) {
  const auto gate = std::make_shared<Gate>();
  auto captured = std::make_shared<int>();
  const std::weak_ptr<int> watched = captured;
  const Ref<ScheduledItem> item = StartTimer(Clock::now(), [gate, captured = std::move(captured)] { gate->Pass(); });
  ASSERT_TRUE(gate->WaitForArrivals(1));
  EXPECT_FALSE(item->IsDone());
  item->Cancel(); // too late: it runs
  EXPECT_FALSE(item->IsDone());
  EXPECT_FALSE(watched.expired());
  gate->Open();
  ASSERT_TRUE(Eventually([&item] { return item->IsDone(); }));
  EXPECT_TRUE(watched.expired());
}

TEST(Timer, RunsWithoutItsItem) {
  EventCount calls;
  StartTimer(Clock::now() + std::chrono::milliseconds(1), [&calls] { calls.Add(); });
  EXPECT_TRUE(calls.WaitFor(1));
}

TEST(Timer, MayBeStartedAndCancelledByTheFunctionOfAnother) {
  EventCount calls;
  const Ref<ScheduledItem> other = StartTimer(Clock::now() + LATER, [] {});
  StartTimer(Clock::now(), [&] {
    other->Cancel();
    StartTimer(Clock::now(), [&calls] { calls.Add(); });
  });
  EXPECT_TRUE(calls.WaitFor(1));
  EXPECT_TRUE(other->IsDone());
}

TEST(Timer, CanPreventTheCallOfATimerThatIsDueAtTheSameTime) {
  const Testing::RecordedLog log;
  // A blocked function keeps the next two waiting until both are due.
  Gate gate;
  StartTimer(Clock::now(), [&gate] { gate.Pass(); });
  ASSERT_TRUE(gate.WaitForArrivals(1));
  const auto due = Clock::now();
  Ref<ScheduledItem> second;
  std::atomic<int> calls{0};
  const Ref<ScheduledItem> first = StartTimer(due, [&] { second->Cancel(); });
  second = StartTimer(due, [&calls] { ++calls; });
  gate.Open();
  EXPECT_TRUE(Eventually([&] { return first->IsDone() && second->IsDone(); }));
  ASSERT_TRUE(DrainIoThreads());
  EXPECT_EQ(calls, 0);
  EXPECT_EQ(log.Lines(), std::vector<std::string>()) << "the function was released, but called";
}

TEST(Timer, LogsAnExceptionAndIsDone) {
  const Testing::RecordedLog log;
  for (const auto &function :
       std::vector<std::function<void()>>{[] { throw InvalidStateException("too early"); }, [] { throw 1; }, nullptr}) {
    const Ref<ScheduledItem> item = StartTimer(Clock::now(), function);
    ASSERT_TRUE(Eventually([&item] { return item->IsDone(); }));
  }
  const std::string start = "Tarvel 8 An exception left the function of a timer: ";
  EXPECT_EQ(log.Lines(), (std::vector<std::string>{start + "Tarvel::InvalidStateException: too early",
                                                   start + "an object that is not a std::exception",
                                                   start + "std::bad_function_call: bad_function_call"}));
}

TEST(Timer, OccupiesNoMemoryAfterItIsCancelled) {
  const Ref<ScheduledItem> kept = StartTimer(Clock::now() + LATER, [] {});
  const std::size_t before = Testing::CountAllocatedBytes();
  for (int i = 0; i < 10000; ++i) {
    StartTimer(Clock::now() + LATER, [] {})->Cancel();
  }
  EXPECT_LT(Testing::CountAllocatedBytes(), before + 1000);
  kept->Cancel();
}

TEST(Timer, RunsAllOfTenThousandThatAreDueTogether) {
  const auto time = Clock::now() + std::chrono::milliseconds(50);
  EventCount calls;
  for (int i = 0; i < 10000; ++i) {
    StartTimer(time, [&calls] { calls.Add(); });
  }
  EXPECT_TRUE(calls.WaitFor(10000));
}

TEST(Timer, HasOneOutcomeWhenItIsCancelledWhileItBecomesDue) {
  for (int round = 0; round < 200; ++round) {
    std::atomic<int> calls{0};
    std::vector<Ref<ScheduledItem>> items;
    for (int i = 0; i < 50; ++i) {
      items.push_back(StartTimer(Clock::now() + std::chrono::microseconds(i), [&calls] { ++calls; }));
    }
    for (const Ref<ScheduledItem> &item : items) {
      item->Cancel();
    }
    for (const Ref<ScheduledItem> &item : items) {
      ASSERT_TRUE(Eventually([&item] { return item->IsDone(); }));
    }
    const int callsAtTheEnd = calls;
    ASSERT_LE(callsAtTheEnd, 50);
    ASSERT_TRUE(DrainIoThreads());
    ASSERT_EQ(calls, callsAtTheEnd) << "a timer that was done ran again";
  }
}

} // namespace
} // namespace Tarvel::System
