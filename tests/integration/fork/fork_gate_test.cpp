// SPDX-License-Identifier: Apache-2.0

#include "core/fork_gate.h"

#include "support/forked.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <mutex>
#include <optional>
#include <pthread.h>
#include <thread>

namespace Tarvel::System {
namespace {

using Testing::RunInChild;

constexpr int FORKS = 100;

std::atomic<int> computed{0};

void Compute() {
  const Computation computing;
  ++computed;
}

/// Holds `holder` until another thread waits in `fork`, and records the release.
template <typename Holder>
void HoldUntilAForkWaits(Holder &holder, Testing::EventCount &held, std::atomic<bool> &released) {
  holder.lock();
  held.Add();
  while (!IsForkUnderWay()) {
    std::this_thread::yield();
  }
  std::this_thread::sleep_for(std::chrono::milliseconds(20)); // longer than a fork that does not wait takes
  released = true;
  holder.unlock();
}

TEST(ForkGate, WaitsForAMutexThatAnotherThreadHolds) {
  ForkSafeMutex mutex;
  Testing::EventCount held;
  std::atomic<bool> released{false};
  std::thread holder([&] { HoldUntilAForkWaits(mutex, held, released); });
  ASSERT_TRUE(held.WaitFor(1));
  EXPECT_EQ(RunInChild([&] {
              EXPECT_TRUE(released);
              const std::lock_guard<ForkSafeMutex> lock(mutex);
            }),
            "");
  holder.join();
}

TEST(ForkGate, WaitsForTheEndOfNestedComputations) {
  struct Twice {
    void lock() {
      outer.emplace();
      inner.emplace();
    }
    void unlock() {
      inner.reset();
      outer.reset();
    }
    std::optional<Computation> outer;
    std::optional<Computation> inner;
  } twice;
  Testing::EventCount begun;
  std::atomic<bool> released{false};
  std::thread computing([&] { HoldUntilAForkWaits(twice, begun, released); });
  ASSERT_TRUE(begun.WaitFor(1));
  EXPECT_EQ(RunInChild([&] { EXPECT_TRUE(released); }), "");
  computing.join();
}

TEST(ForkGate, DoesNotWaitForTheHostsCodeWithinComputations) {
  Testing::Gate gate;
  std::thread calling([&] {
    const Computation outer;
    const Computation inner;
    const HostCall call;
    gate.Pass();
  });
  ASSERT_TRUE(gate.WaitForArrivals(1));
  EXPECT_EQ(RunInChild([] {}), "");
  gate.Open();
  calling.join();
}

TEST(ForkGate, LetsAThreadForkWithinItsOwnComputation) {
  ForkSafeMutex mutex;
  const Computation computing;
  EXPECT_EQ(RunInChild([&] {
              const std::lock_guard<ForkSafeMutex> lock(mutex);
              EXPECT_EQ(RunInChild([] {}), "");
            }),
            "");
}

TEST(ForkGate, LetsAThreadForkWithinAComputationThatAnotherForkWaitsFor) {
  if (!Testing::MAY_FORK_WHILE_OTHERS_ALLOCATE) {
    GTEST_SKIP() << "the sanitizer's allocator may stay locked in the child";
  }
  Testing::EventCount begun;
  std::thread within([&begun] {
    const Computation computing;
    begun.Add();
    while (!IsForkUnderWay()) {
      std::this_thread::yield();
    }
    EXPECT_EQ(RunInChild([] {}), "");
  });
  ASSERT_TRUE(begun.WaitFor(1));
  EXPECT_EQ(RunInChild([] {}), "");
  within.join();
}

// For example, a module of OpenSSL may start a program while it holds a lock that another thread waits for.
TEST(ForkGate, DoesNotWaitForAThreadThatWaitsForALockOfTheForkingOne) {
  std::mutex held;
  Testing::EventCount waiting;
  std::unique_lock<std::mutex> lock(held);
  std::thread other([&] {
    const Computation computing;
    waiting.Add();
    const std::lock_guard<std::mutex> later(held);
  });
  ASSERT_TRUE(waiting.WaitFor(1));
  {
    const Computation computing;
    EXPECT_EQ(RunInChild([] {}), "");
  }
  lock.unlock();
  other.join();
  EXPECT_EQ(RunInChild([] { Compute(); }), "") << "later forks are not affected";
}

TEST(ForkGate, LeavesNoMutexLockedInAChildOfABusyParent) {
  ForkSafeMutex mutex;
  std::atomic<bool> stop{false};
  std::atomic<int> rounds{0};
  const auto work = [&] {
    while (!stop) {
      const std::lock_guard<ForkSafeMutex> lock(mutex);
      ++rounds;
    }
  };
  std::thread first(work);
  std::thread second(work);
  for (int i = 0; i < FORKS; ++i) {
    ASSERT_EQ(RunInChild([&] { const std::lock_guard<ForkSafeMutex> lock(mutex); }), "") << i;
    const int before = rounds;
    ASSERT_TRUE(Testing::Eventually([&] { return rounds > before; })) << "the parent's threads go on";
  }
  stop = true;
  first.join();
  second.join();
}

TEST(ForkGate, LetsTwoThreadsForkAtOnce) {
  if (!Testing::MAY_FORK_WHILE_OTHERS_ALLOCATE) {
    GTEST_SKIP() << "the sanitizer's allocator may stay locked in the child";
  }
  ForkSafeMutex mutex;
  const auto forkOften = [&] {
    for (int i = 0; i < FORKS / 10; ++i) {
      EXPECT_EQ(RunInChild([&] { const std::lock_guard<ForkSafeMutex> lock(mutex); }), "");
    }
  };
  std::thread other(forkOften);
  forkOften();
  other.join();
}

TEST(ForkGate, CountsOneMoreForkInEachChild) {
  Compute(); // forks before the first computation do not count
  const unsigned own = GetForkGeneration();
  EXPECT_EQ(RunInChild([&] {
              EXPECT_EQ(GetForkGeneration(), own + 1);
              EXPECT_EQ(RunInChild([&] { EXPECT_EQ(GetForkGeneration(), own + 2); }), "");
            }),
            "");
  EXPECT_EQ(GetForkGeneration(), own);
}

// Handlers that were registered first run last before a fork, and first after it.
TEST(ForkGate, LetsForkHandlersOfTheHostCompute) {
  static const bool areRegistered = [] {
    const bool before = pthread_atfork(Compute, Compute, Compute) == 0;
    Compute(); // registers the gate's handlers, unless an earlier test did
    return before && pthread_atfork(Compute, Compute, Compute) == 0;
  }();
  ASSERT_TRUE(areRegistered);
  computed = 0;
  EXPECT_EQ(RunInChild([] { EXPECT_EQ(computed, 4); }), "");
  EXPECT_EQ(computed, 4);
}

} // namespace
} // namespace Tarvel::System
