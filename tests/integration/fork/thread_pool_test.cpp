// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/thread_pool.h>

#include "support/forked.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <utility>

namespace Tarvel::System {
namespace {

using Testing::EventCount;
using Testing::Gate;
using Testing::RunInChild;
using Testing::Shared;

/// Whether the pool still runs items.
bool Runs(ThreadPool &pool) {
  const auto ran = std::make_shared<EventCount>();
  pool.QueueWorkItem([ran] { ran->Add(); });
  return ran->WaitFor(1);
}

TEST(ThreadPoolAfterFork, StartsItsOwnThreadsInTheChild) {
  const Ref<ThreadPool> own = CreateThreadPool(2);
  ASSERT_TRUE(Runs(*own));
  ASSERT_TRUE(Runs(*GetThreadPool())); // so that it has an idle thread, which does not exist in the child
  ASSERT_TRUE(Runs(*GetComputePool()));
  EXPECT_EQ(RunInChild([&] {
              EXPECT_EQ(own->GetThreadCount(), 0u);
              EXPECT_EQ(own->GetThreadCeiling(), 2u);
              EXPECT_TRUE(Runs(*own));
              EXPECT_TRUE(Runs(*GetThreadPool()));
              EXPECT_TRUE(Runs(*GetComputePool()));
              EXPECT_EQ(own->GetThreadCount(), 1u);
              EXPECT_EQ(RunInChild([&] { EXPECT_TRUE(Runs(*own)); }), "") << "the child's own child";
            }),
            "");
  EXPECT_TRUE(Runs(*own));
}

TEST(ThreadPoolAfterFork, RunsNoItemOfTheParentInTheChild) {
  const Shared<std::atomic<int>> runs;
  const Ref<ThreadPool> pool = CreateThreadPool(1);
  const auto gate = std::make_shared<Gate>();
  const Ref<ScheduledItem> running = pool->QueueWorkItem([gate, &runs] {
    gate->Pass();
    ++*runs;
  });
  ASSERT_TRUE(gate->WaitForArrivals(1));
  const Ref<ScheduledItem> queued = pool->QueueWorkItem([&runs] { ++*runs; });
  EXPECT_EQ(RunInChild([&] {
              EXPECT_TRUE(running->IsDone());
              EXPECT_TRUE(queued->IsDone());
              running->Cancel();
              queued->Cancel();
              EXPECT_TRUE(Runs(*pool));
              EXPECT_EQ(*runs, 0);
            }),
            "");
  EXPECT_FALSE(running->IsDone());
  EXPECT_FALSE(queued->IsDone());
  gate->Open();
  EXPECT_TRUE(Testing::Eventually([&] { return *runs == 2; }));
}

TEST(ThreadPoolAfterFork, ReleasesTheParentsQueuedItemsInTheChild) {
  const Ref<ThreadPool> pool = CreateThreadPool(1);
  const auto gate = std::make_shared<Gate>();
  pool->QueueWorkItem([gate] { gate->Pass(); });
  ASSERT_TRUE(gate->WaitForArrivals(1));
  auto held = std::make_shared<int>(0);
  const std::weak_ptr<int> watched = held;
  pool->QueueWorkItem([held = std::move(held)] {});
  EXPECT_EQ(RunInChild([&] {
              EXPECT_TRUE(Runs(*pool));
              EXPECT_TRUE(watched.expired());
            }),
            "");
  EXPECT_FALSE(watched.expired());
  gate->Open();
}

TEST(ThreadPoolAfterFork, RunsItemsInAChildThatAnItemMade) {
  const auto outcome = std::make_shared<std::string>("never run");
  EventCount done;
  GetThreadPool()->QueueWorkItem([outcome, &done] {
    *outcome = RunInChild([] { EXPECT_TRUE(Runs(*GetThreadPool())); });
    done.Add();
  });
  ASSERT_TRUE(done.WaitFor(1));
  EXPECT_EQ(*outcome, "");
  EXPECT_TRUE(Runs(*GetThreadPool()));
}

TEST(ThreadPoolAfterFork, IsDestroyedInTheChildWithoutWaitingForTheParentsThreads) {
  Ref<ThreadPool> pool = CreateThreadPool(2);
  const auto gate = std::make_shared<Gate>();
  pool->QueueWorkItem([gate] { gate->Pass(); });
  ASSERT_TRUE(gate->WaitForArrivals(1));
  EXPECT_EQ(RunInChild([&] { pool.reset(); }), "");
  EXPECT_EQ(RunInChild([&] {
              EXPECT_TRUE(Runs(*pool));
              pool.reset();
            }),
            "");
  gate->Open();
}

} // namespace
} // namespace Tarvel::System
