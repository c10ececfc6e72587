// SPDX-License-Identifier: Apache-2.0
// Cancellation and callbacks in a child that `fork` makes.
#include "client/delivery.h"

#include "support/forked.h"
#include "support/rendezvous.h"

#include <ssoclient/client/cancellation.h>

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <stop_token>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using Testing::EventCount;
using Testing::Gate;
using Testing::RunInChild;
using Testing::Shared;

TEST(CancellationAfterFork, CallsOnlyTheFunctionsOfTheChild) {
  const CancelSource source;
  std::string calls;
  const CancelRegistration ofParent = source.GetToken().OnCancel([&calls] { calls += "parent "; });
  EXPECT_EQ(RunInChild([&] {
              const CancelRegistration ofChild = source.GetToken().OnCancel([&calls] { calls += "child "; });
              source.Cancel();
              EXPECT_EQ(calls, "child ");
            }),
            "");
  EXPECT_FALSE(source.IsCancelled()) << "only the child has cancelled";
  source.Cancel();
  EXPECT_EQ(calls, "parent ");
}

TEST(CancellationAfterFork, PassesThroughTheTokensOfTheParent) {
  const CancelSource first;
  std::stop_source second;
  const CancelToken either = CancelToken::AnyOf(first.GetToken(), second.get_token());
  EXPECT_EQ(RunInChild([&] {
              first.Cancel();
              EXPECT_TRUE(either.IsCancelled());
            }),
            "");
  EXPECT_EQ(RunInChild([&] {
              second.request_stop();
              EXPECT_TRUE(either.IsCancelled());
            }),
            "");
  EXPECT_FALSE(either.IsCancelled());
}

TEST(CancellationAfterFork, WorksEvenIfThreadsOfTheParentWereRegistering) {
  const CancelSource source;
  std::atomic<bool> isOver{false};
  std::vector<std::thread> threads;
  for (int i = 0; i < 2; ++i) {
    threads.emplace_back([&] {
      while (!isOver) {
        const CancelRegistration registration = source.GetToken().OnCancel([] {});
      }
    });
  }
  for (int i = 0; i < (Testing::MAY_FORK_WHILE_OTHERS_ALLOCATE ? 50 : 0); ++i) {
    EXPECT_EQ(RunInChild([&] {
                int calls = 0;
                const CancelRegistration registration = source.GetToken().OnCancel([&calls] { ++calls; });
                source.Cancel();
                EXPECT_EQ(calls, 1);
              }),
              "");
  }
  isOver = true;
  for (std::thread &thread : threads) {
    thread.join();
  }
}

TEST(CallbackAfterFork, RunsOnlyInTheParent) {
  const Shared<std::atomic<int>> runs;
  std::vector<std::function<void()>> queue;
  RunOn([&queue](std::function<void()> function) { queue.push_back(std::move(function)); }, [&runs] { ++*runs; });
  EXPECT_EQ(RunInChild([&] {
              queue.front()(); // like an event loop that continues in the child
              queue.clear();   // releases the function, which must not run elsewhere because of this
              EventCount ran;
              RunOn({}, [&ran] { ran.Add(); });
              EXPECT_TRUE(ran.WaitFor(1)) << "the child's own callback";
              EXPECT_EQ(*runs, 0);
            }),
            "");
  queue.front()();
  EXPECT_EQ(*runs, 1);
}

TEST(CallbackAfterFork, RunsInTheParentIfAnotherCallbackForks) {
  const Shared<std::atomic<int>> runs;
  EventCount ran;
  Testing::ChildOutcome outcome = "never run";
  RunOn({}, [&] {
    outcome = RunInChild([] {});
    ran.Add();
  });
  RunOn({}, [&] {
    ++*runs;
    ran.Add();
  });
  EXPECT_TRUE(ran.WaitFor(2));
  EXPECT_EQ(outcome, "");
  EXPECT_EQ(*runs, 1);
}

} // namespace
} // namespace SsoClient
