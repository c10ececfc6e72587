// SPDX-License-Identifier: Apache-2.0

#include "client/delivery.h"

#include "support/process_resources.h"
#include "support/recorded_log.h"
#include "support/rendezvous.h"
#include "support/sanitized.h"

#include <tarvel/system/thread_pool.h>

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using Testing::EventCount;
using Testing::Eventually;
using Testing::RecordedLog;

using Function = std::function<void()>;

/// A function for `RunOn`, and what became of it.
class Watched {
public:
  Function Make() {
    return [this, held = m_held] {
      m_thread = std::this_thread::get_id();
      ++m_runs;
      m_ran.Add();
    };
  }

  /// Waits, and returns whether the function has run exactly once and what it captures is released.
  bool HasRunOnce() {
    return m_ran.WaitFor(1) && Eventually([this] { return m_held.use_count() == 1; }) && m_runs == 1;
  }
  bool HasRunHere() { return HasRunOnce() && m_thread == std::this_thread::get_id(); }
  bool HasRunElsewhere() { return HasRunOnce() && m_thread != std::this_thread::get_id(); }
  int GetRuns() const { return m_runs; }

private:
  std::shared_ptr<int> m_held = std::make_shared<int>(0);
  EventCount m_ran;
  std::atomic<int> m_runs{0};
  std::thread::id m_thread;
};

TEST(RunOn, RunsTheFunctionOnAThreadOfThePlatformIfThereIsNoExecutor) {
  Watched watched;
  RunOn({}, watched.Make());
  EXPECT_TRUE(watched.HasRunElsewhere());
}

TEST(RunOn, RunsTheFunctionWhereTheExecutorRunsIt) {
  Watched atOnce;
  RunOn([](const Function &function) { function(); }, atOnce.Make());
  EXPECT_TRUE(atOnce.HasRunHere());

  Watched later;
  std::vector<Function> queue;
  RunOn([&queue](Function function) { queue.push_back(std::move(function)); }, later.Make());
  ASSERT_EQ(queue.size(), 1u);
  EXPECT_EQ(later.GetRuns(), 0);
  queue.front()();
  EXPECT_TRUE(later.HasRunHere()) << "what the function captures is released though the queue still has the order";
}

TEST(RunOn, RunsTheFunctionOnceIfTheExecutorRunsItOften) {
  Watched watched;
  Function kept;
  RunOn(
      [&kept](const Function &function) {
        kept = function;
        function();
        function();
      },
      watched.Make());
  kept();
  EXPECT_TRUE(watched.HasRunHere());
}

TEST(RunOn, RunsTheFunctionElsewhereIfTheExecutorThrows) {
  Watched watched;
  const RecordedLog log;
  RunOn([](const Function &) { throw std::runtime_error("the loop has ended"); }, watched.Make());
  EXPECT_TRUE(watched.HasRunElsewhere());
  EXPECT_EQ(log.Lines(), (std::vector<std::string>{"SsoClient 8 An executor threw runtime_error: the loop has ended"}));
}

TEST(RunOn, RunsTheFunctionOnceIfTheExecutorThrowsAfterItHasQueuedOrRunIt) {
  Watched queued;
  std::vector<Function> queue;
  RunOn(
      [&queue](const Function &function) {
        queue.push_back(function);
        throw std::runtime_error("cannot wake the loop");
      },
      queued.Make());
  EXPECT_TRUE(queued.HasRunElsewhere()) << "without waiting for the queue, which may never run";
  queue.front()();
  EXPECT_EQ(queued.GetRuns(), 1);

  Watched run;
  RunOn(
      [](const Function &function) {
        function();
        throw std::runtime_error("after the run");
      },
      run.Make());
  EXPECT_TRUE(run.HasRunHere());
}

TEST(RunOn, RunsTheFunctionElsewhereIfTheExecutorDropsIt) {
  Watched atOnce;
  const RecordedLog log;
  RunOn([](const Function &) {}, atOnce.Make());
  EXPECT_TRUE(atOnce.HasRunElsewhere());

  Watched later;
  std::vector<Function> queue;
  RunOn([&queue](const Function &function) { queue.insert(queue.end(), {function, function}); }, later.Make());
  queue.pop_back();
  EXPECT_EQ(later.GetRuns(), 0) << "the executor still has a copy";
  queue.clear();
  EXPECT_TRUE(later.HasRunElsewhere());
  EXPECT_EQ(log.Lines(), std::vector<std::string>());
}

TEST(RunOn, LogsWhatTheFunctionThrows) {
  EventCount runs;
  const Function throwing = [&runs] {
    runs.Add();
    throw std::out_of_range("mine");
  };
  const RecordedLog log;
  RunOn({}, throwing);
  EXPECT_TRUE(log.WaitForLines(1));
  RunOn([](const Function &function) { EXPECT_NO_THROW(function()); }, throwing);
  EXPECT_EQ(runs.Get(), 2);
  EXPECT_EQ(log.Lines(), (std::vector<std::string>{"SsoClient 8 A callback threw out_of_range: mine",
                                                   "SsoClient 8 A callback threw out_of_range: mine"}));
}

TEST(RunOn, LogsNothingIfTheHostSilencesWarnings) {
  const Testing::ScopedLogLevel level(7);
  const RecordedLog log;
  Watched watched;
  RunOn(
      [](const Function &function) {
        function();
        throw std::runtime_error("not logged");
      },
      watched.Make());
  EXPECT_TRUE(watched.HasRunHere());
  EXPECT_EQ(log.Lines(), std::vector<std::string>());
}

TEST(RunOn, LetsAFunctionRunAnother) {
  Watched inner;
  RunOn({}, [&inner] { RunOn({}, inner.Make()); });
  EXPECT_TRUE(inner.HasRunElsewhere());
}

TEST(RunOn, RunsEachFunctionOnceEvenIfExecutorsQueueOrDropItOrThrow) {
  constexpr int COUNT = Testing::IS_SANITIZED ? 2'000 : 20'000;
  const RecordedLog log;
  std::vector<std::atomic<int>> runs(COUNT);
  EventCount ran;
  std::vector<std::thread> threads;
  for (int first = 0; first < 4; ++first) {
    threads.emplace_back([&, first] {
      const Tarvel::Ref<Tarvel::System::ThreadPool> pool = Tarvel::System::GetComputePool();
      for (std::size_t i = static_cast<std::size_t>(first); i < runs.size(); i += 4) {
        const Executor executor = [&pool, i](const Function &function) {
          if (i % 3 == 0) {
            pool->QueueWorkItem(function);
          }
          if (i % 5 == 0) {
            throw std::runtime_error("no");
          }
          if (i % 7 == 0) {
            function();
          }
        };
        RunOn(executor, [&runs, &ran, i] {
          ++runs[i];
          ran.Add();
        });
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_TRUE(ran.WaitFor(COUNT));
  for (const std::atomic<int> &count : runs) {
    ASSERT_EQ(count, 1);
  }
}

} // namespace
} // namespace SsoClient
