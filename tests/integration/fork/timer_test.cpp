// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/timer.h>

#include "support/forked.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <string>
#include <unistd.h>
#include <utility>

namespace Tarvel::System {
namespace {

using Testing::EventCount;
using Testing::Gate;
using Testing::RunInChild;
using Testing::Shared;

using Clock = std::chrono::steady_clock;

constexpr std::chrono::hours LATER{1};

/// Whether a timer that is started now runs.
bool Runs() {
  const auto ran = std::make_shared<EventCount>();
  StartTimer(Clock::now(), [ran] { ran->Add(); });
  return ran->WaitFor(1);
}

TEST(TimerAfterFork, RunsInTheChildAndInItsOwnChild) {
  ASSERT_TRUE(Runs());
  EXPECT_EQ(RunInChild([] {
              EXPECT_TRUE(Runs());
              EXPECT_EQ(RunInChild([] { EXPECT_TRUE(Runs()); }), "") << "the child's own child";
            }),
            "");
  EXPECT_TRUE(Runs());
}

TEST(TimerAfterFork, CallsNoFunctionOfTheParentInTheChild) {
  const Shared<std::atomic<int>> calls;
  const auto gate = std::make_shared<Gate>();
  const Ref<ScheduledItem> running = StartTimer(Clock::now(), [gate, &calls] {
    gate->Pass();
    ++*calls;
  });
  ASSERT_TRUE(gate->WaitForArrivals(1));
  // It becomes due in the child while the child's own timers run.
  const auto due = Clock::now() + std::chrono::milliseconds(300);
  const Ref<ScheduledItem> waiting = StartTimer(due, [&calls] { *calls += 10; });
  EXPECT_EQ(RunInChild([&] {
              EXPECT_TRUE(running->IsDone());
              EXPECT_TRUE(waiting->IsDone());
              const auto after = std::make_shared<EventCount>();
              StartTimer(due + std::chrono::milliseconds(20), [after] { after->Add(); });
              EXPECT_TRUE(after->WaitFor(1));
            }),
            "");
  gate->Open();
  EXPECT_TRUE(Testing::Eventually([&] { return *calls == 11; })) << *calls;
  EXPECT_TRUE(Testing::Eventually([&] { return running->IsDone() && waiting->IsDone(); }));
}

TEST(TimerAfterFork, OfTheParentCanBeCancelledInTheChildWithoutEffectOnTheParent) {
  auto captured = std::make_shared<int>();
  const std::weak_ptr<int> watched = captured;
  const Ref<ScheduledItem> item = StartTimer(Clock::now() + LATER, [captured = std::move(captured)] {});
  EXPECT_EQ(RunInChild([&] {
              item->Cancel();
              EXPECT_TRUE(watched.expired());
              EXPECT_TRUE(Runs());
            }),
            "");
  EXPECT_FALSE(item->IsDone());
  EXPECT_FALSE(watched.expired());
  item->Cancel();
  EXPECT_TRUE(watched.expired());
}

TEST(TimerAfterFork, RunsInAChildThatTheFunctionOfATimerMade) {
  const auto outcome = std::make_shared<std::string>("never run");
  const auto done = std::make_shared<EventCount>();
  StartTimer(Clock::now(), [outcome, done] {
    *outcome = RunInChild([] { EXPECT_TRUE(Runs()); });
    done->Add();
  });
  ASSERT_TRUE(done->WaitFor(1));
  EXPECT_EQ(*outcome, "");
  EXPECT_TRUE(Runs());
}

/// Ends a child when its only thread ends. The functions of `atexit` do not run, because they need the parent's other
/// threads.
struct ChildEnder {
  ~ChildEnder() {
    if (isInChild) {
      ::_exit(0);
    }
  }
  bool isInChild = false;
};
thread_local ChildEnder ender;

// A blocked function keeps two timers waiting until both are due. The function of the first timer forks, and the
// child's thread continues in the middle of the parent's loop over both timers.
TEST(TimerAfterFork, CallsNoFurtherFunctionInAChildThatAFunctionMade) {
  const auto gate = std::make_shared<Gate>();
  StartTimer(Clock::now(), [gate] { gate->Pass(); });
  ASSERT_TRUE(gate->WaitForArrivals(1));
  const Shared<std::atomic<int>> calls;
  std::atomic<pid_t> child{-1};
  const auto now = Clock::now();
  StartTimer(now, [&child] {
    const pid_t forked = ::fork();
    ender.isInChild = forked == 0;
    child = forked;
  });
  StartTimer(now, [&calls] { ++*calls; });
  gate->Open();
  ASSERT_TRUE(Testing::Eventually([&] { return *calls >= 1; }));
  ASSERT_GT(child, 0);
  EXPECT_EQ(Testing::WaitForChild(child), "");
  EXPECT_EQ(*calls, 1);
}

} // namespace
} // namespace Tarvel::System
