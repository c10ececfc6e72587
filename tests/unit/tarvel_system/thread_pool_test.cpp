// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/thread_pool.h>

#include "support/completion.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"
#include "support/scripted_server.h"
#include "system/thread_pool.h"

#include <tarvel/core/exception.h>
#include <tarvel/service/app.h>
#include <tarvel/system/stream.h>

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <chrono>
#include <csignal>
#include <future>
#include <memory>
#include <mutex>
#include <pthread.h>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace Tarvel::System {
namespace {

using Testing::Completion;
using Testing::Eventually;
using Testing::PATIENCE;

/// `Wait` returns a work item that blocks until `Open` is called.
class Gate {
public:
  auto Wait() {
    return [opened = m_opened] { opened.wait_for(PATIENCE); };
  }
  void Open() { m_promise.set_value(); }

private:
  std::promise<void> m_promise;
  std::shared_future<void> m_opened = m_promise.get_future().share();
};

TEST(ThreadPool, HasNoThreadBeforeTheFirstItem) {
  const Ref<ThreadPool> pool = CreateThreadPool(3);
  EXPECT_EQ(pool->GetThreadCeiling(), 3u);
  EXPECT_EQ(pool->GetThreadCount(), 0u);
}

TEST(ThreadPool, HasACeilingOfAtLeastOneThread) {
  EXPECT_EQ(CreateThreadPool(0)->GetThreadCeiling(), 1u);
}

TEST(ThreadPool, StartsItemsInOrder) {
  const Ref<ThreadPool> pool = CreateThreadPool(1);
  std::vector<int> order;
  std::promise<void> last;
  for (int i = 0; i < 100; ++i) {
    pool->QueueWorkItem([&order, i] { order.push_back(i); });
  }
  pool->QueueWorkItem([&last] { last.set_value(); });
  ASSERT_EQ(last.get_future().wait_for(PATIENCE), std::future_status::ready);
  ASSERT_EQ(order.size(), 100u);
  EXPECT_TRUE(std::is_sorted(order.begin(), order.end()));
}

TEST(ThreadPool, StartsUrgentItemsBeforeTheOthersAndInOrder) {
  Testing::Gate gate;
  const Ref<ThreadPool> pool = CreateThreadPool(1);
  pool->QueueWorkItem([&gate] { gate.Pass(); });
  ASSERT_TRUE(gate.WaitForArrivals(1)); // otherwise the thread could run an item before it is cancelled
  std::vector<int> order;
  std::promise<void> last;
  pool->QueueWorkItem([&order] { order.push_back(3); });
  pool->QueueWorkItem([&last] { last.set_value(); });
  pool->QueueUrgentItem([&order] { order.push_back(1); });
  const Ref<ScheduledItem> cancelled = pool->QueueUrgentItem([&order] { order.push_back(0); });
  pool->QueueUrgentItem([&order] { order.push_back(2); });
  cancelled->Cancel();
  gate.Open();
  ASSERT_EQ(last.get_future().wait_for(PATIENCE), std::future_status::ready);
  EXPECT_EQ(order, (std::vector<int>{1, 2, 3}));
}

TEST(ThreadPool, StartsAThreadForAnUrgentItemAndDropsItWhenDestroyed) {
  Ref<ThreadPool> pool = CreateThreadPool(1);
  Gate gate;
  std::promise<void> begun;
  pool->QueueUrgentItem([&begun, wait = gate.Wait()] {
    begun.set_value();
    wait();
  });
  ASSERT_EQ(begun.get_future().wait_for(PATIENCE), std::future_status::ready);
  const auto captured = std::make_shared<int>();
  const Ref<ScheduledItem> dropped = pool->QueueUrgentItem([captured] { ADD_FAILURE() << "was run"; });
  std::thread destroyer([&pool] { pool.reset(); });
  EXPECT_TRUE(Eventually([&] { return dropped->IsDone(); }));
  EXPECT_TRUE(Eventually([&] { return captured.use_count() == 1; }));
  gate.Open();
  destroyer.join();
}

TEST(ThreadPool, GrowsToTheCeilingAndNoFurther) {
  const Ref<ThreadPool> pool = CreateThreadPool(4);
  Gate gate;
  for (int i = 0; i < 20; ++i) {
    pool->QueueWorkItem(gate.Wait());
  }
  EXPECT_EQ(pool->GetThreadCount(), 4u);
  gate.Open();
}

TEST(ThreadPool, AnIdleThreadTakesTheNextItem) {
  constexpr std::size_t CEILING = 1000;
  const Ref<ThreadPool> pool = CreateThreadPool(CEILING, PATIENCE);
  // An item is done a moment before its thread is idle again, so the pool may start another thread for the next item.
  EXPECT_TRUE(Eventually([&pool] {
    const std::size_t before = pool->GetThreadCount();
    const Ref<ScheduledItem> item = pool->QueueWorkItem([] {});
    EXPECT_TRUE(Eventually([&item] { return item->IsDone(); }));
    return pool->GetThreadCount() == before;
  }));
  EXPECT_LT(pool->GetThreadCount(), CEILING);
}

TEST(ThreadPool, AnIdleThreadNeverRetiresWhenTheIdleTimeIsEndless) {
  const Ref<ThreadPool> pool = CreateThreadPool(1, std::chrono::milliseconds::max());
  const auto countOnItsThread = [&pool] {
    std::promise<int> counted;
    pool->QueueWorkItem([&counted] {
      thread_local int count = 0;
      counted.set_value(++count);
    });
    return counted.get_future().get();
  };
  for (int item = 1; item <= 20; ++item) {
    EXPECT_EQ(countOnItsThread(), item);
  }
}

TEST(ThreadPool, IdleThreadsRetire) {
  const std::size_t before = Testing::CountThreads();
  const Ref<ThreadPool> pool = CreateThreadPool(8, std::chrono::milliseconds(1));
  Gate gate;
  for (int i = 0; i < 8; ++i) {
    pool->QueueWorkItem(gate.Wait());
  }
  EXPECT_EQ(pool->GetThreadCount(), 8u);
  gate.Open();
  EXPECT_TRUE(Eventually([&] { return pool->GetThreadCount() == 0; }));
  EXPECT_TRUE(Eventually([&] { return Testing::CountThreads() <= before; }));
  std::promise<void> again;
  pool->QueueWorkItem([&again] { again.set_value(); });
  EXPECT_EQ(again.get_future().wait_for(PATIENCE), std::future_status::ready);
}

TEST(ThreadPool, AnIdleThreadOfAnEndlessPoolStaysUntilTheHookLetsItEnd) {
  static std::atomic<int> calls{0};
  static std::atomic<bool> mayEnd{false};
  const ThreadEndHook earlier = SetThreadEndHook([]() noexcept {
    ++calls;
    return mayEnd.load();
  });
  static const Ref<ThreadPool> pool = CreateEndlessThreadPool(1, std::chrono::milliseconds(1));
  pool->QueueWorkItem([] {});
  EXPECT_TRUE(Eventually([] { return calls >= 3; }));
  EXPECT_EQ(pool->GetThreadCount(), 1u);
  std::promise<void> served;
  pool->QueueWorkItem([&served] { served.set_value(); });
  EXPECT_EQ(served.get_future().wait_for(PATIENCE), std::future_status::ready);
  mayEnd = true;
  EXPECT_TRUE(Eventually([] { return pool->GetThreadCount() == 0; }));
  SetThreadEndHook(earlier);
}

TEST(ThreadPool, LogsAnExceptionAndEndsThatItemOnly) {
  const Ref<Service::LogRoot> root = Service::GetApp().GetRootLogger();
  std::mutex mutex;
  std::vector<std::string> lines;
  root->SetSink([&](const Service::LogRecord &record) {
    const std::lock_guard<std::mutex> lock(mutex);
    lines.push_back(std::string(record.logger) + "/" + std::to_string(record.level) + "/" +
                    std::string(record.message));
  });
  const Ref<ThreadPool> pool = CreateThreadPool(1);
  pool->QueueWorkItem([] { throw InvalidStateException("too early"); });
  pool->QueueWorkItem([] { throw std::runtime_error("of the library"); });
  pool->QueueWorkItem([] { throw 1; });
  pool->QueueWorkItem({});
  std::promise<void> after;
  pool->QueueWorkItem([&after] { after.set_value(); });
  EXPECT_EQ(after.get_future().wait_for(PATIENCE), std::future_status::ready);
  root->SetSink(nullptr);
  const std::string start = "Tarvel/8/An exception left a work item of the thread pool: ";
  const std::lock_guard<std::mutex> lock(mutex);
  EXPECT_EQ(lines, (std::vector<std::string>{start + "Tarvel::InvalidStateException: too early",
                                             start + "std::runtime_error: of the library",
                                             start + "an object that is not a std::exception",
                                             start + "std::bad_function_call: bad_function_call"}));
}

TEST(ThreadPool, ACancelledItemNeverBegins) {
  const Ref<ThreadPool> pool = CreateThreadPool(1);
  Gate gate;
  const Ref<ScheduledItem> running = pool->QueueWorkItem(gate.Wait());
  bool ran = false;
  auto held = std::make_shared<int>();
  const std::weak_ptr<int> watch = held;
  const Ref<ScheduledItem> item = pool->QueueWorkItem([&ran, held = std::move(held)] { ran = true; });
  EXPECT_FALSE(item->IsDone());
  item->Cancel();
  item->Cancel();
  EXPECT_TRUE(item->IsDone());
  EXPECT_TRUE(watch.expired());
  gate.Open();
  std::promise<void> after;
  pool->QueueWorkItem([&after] { after.set_value(); });
  ASSERT_EQ(after.get_future().wait_for(PATIENCE), std::future_status::ready);
  EXPECT_FALSE(ran);
  running->Cancel();
  EXPECT_TRUE(running->IsDone());
}

TEST(ThreadPool, WorkIsDestroyedBeforeItsItemIsDone) {
  const Ref<ThreadPool> pool = CreateThreadPool(1);
  auto held = std::make_shared<int>();
  const std::weak_ptr<int> watch = held;
  const Ref<ScheduledItem> item = pool->QueueWorkItem([held = std::move(held)] {});
  ASSERT_TRUE(Eventually([&] { return item->IsDone(); }));
  EXPECT_TRUE(watch.expired());
}

TEST(ThreadPool, WaitsForRunningWorkAndDropsTheQueueWhenDestroyed) {
  Ref<ThreadPool> pool = CreateThreadPool(1);
  std::promise<void> begun;
  Gate gate;
  std::atomic<bool> ended{false};
  bool ran = false;
  pool->QueueWorkItem([&, wait = gate.Wait()] {
    begun.set_value();
    wait();
    ended = true;
  });
  const Ref<ScheduledItem> queued = pool->QueueWorkItem([&ran] { ran = true; });
  ASSERT_EQ(begun.get_future().wait_for(PATIENCE), std::future_status::ready);
  std::thread dropper([&pool] { pool.reset(); });
  ASSERT_TRUE(Eventually([&] { return queued->IsDone(); }));
  EXPECT_FALSE(ended);
  gate.Open();
  dropper.join();
  EXPECT_TRUE(ended);
  EXPECT_FALSE(ran);
}

TEST(ThreadPool, MayBeReleasedByItsOwnWork) {
  const std::size_t before = Testing::CountThreads();
  auto pool = std::make_shared<Ref<ThreadPool>>(CreateThreadPool(2));
  std::promise<void> dropped;
  Gate gate;
  (*pool)->QueueWorkItem([pool, &dropped, wait = gate.Wait()] {
    wait();
    pool->reset();
    dropped.set_value();
  });
  pool.reset();
  gate.Open();
  EXPECT_EQ(dropped.get_future().wait_for(PATIENCE), std::future_status::ready);
  EXPECT_TRUE(Eventually([&] { return Testing::CountThreads() <= before; }));
}

TEST(ThreadPool, ItsThreadsBlockTheSignalsOfTheProcess) {
  std::promise<sigset_t> mask;
  const Ref<ThreadPool> pool = CreateThreadPool(1);
  pool->QueueWorkItem([&mask] {
    sigset_t blocked;
    pthread_sigmask(SIG_BLOCK, nullptr, &blocked);
    mask.set_value(blocked);
  });
  const sigset_t blocked = mask.get_future().get();
  for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGCHLD, SIGALRM, SIGUSR1, SIGPIPE}) {
    EXPECT_EQ(sigismember(&blocked, signal), 1) << signal;
  }
  EXPECT_EQ(sigismember(&blocked, SIGSEGV), 0);
  sigset_t own;
  pthread_sigmask(SIG_BLOCK, nullptr, &own);
  EXPECT_EQ(sigismember(&own, SIGINT), 0);
}

TEST(GetThreadPool, ReturnsTheSamePoolEachTime) {
  EXPECT_EQ(GetThreadPool(), GetThreadPool());
  EXPECT_EQ(GetThreadPool()->GetThreadCeiling(), DEFAULT_THREAD_CEILING);
  std::promise<void> ran;
  GetThreadPool()->QueueWorkItem([&ran] { ran.set_value(); });
  EXPECT_EQ(ran.get_future().wait_for(PATIENCE), std::future_status::ready);
}

/// Makes one exchange over a new connection, and blocks until it ends. @return what was read back, or the failure.
std::string Exchange(int port) {
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  Completion connected;
  socket->AsyncConnect("127.0.0.1", port, connected.ForEnd());
  if (const std::string failure = connected.GetMessage(); !failure.empty()) {
    return failure;
  }
  Completion written;
  socket->AsyncWrite("ping", 4, written.ForTransfer());
  std::string answer(16, '\0');
  Completion read;
  socket->AsyncReadSome(answer.data(), answer.size(), read.ForTransfer());
  if (const std::string failure = written.GetMessage() + read.GetMessage(); !failure.empty()) {
    return failure;
  }
  answer.resize(read.GetCount());
  socket->Close();
  return answer;
}

class ThreadPoolCeiling : public testing::TestWithParam<std::size_t> {};

TEST_P(ThreadPoolCeiling, FinishesFiveHundredItemsThatWaitForTheNetwork) {
  constexpr int ITEMS = 500;
  Testing::ScriptedServer server([](Testing::ServerConnection &connection) {
    connection.ReadExactly(4);
    connection.Write("pong");
  });
  const Ref<ThreadPool> pool = CreateThreadPool(GetParam());
  std::atomic<int> right{0};
  std::atomic<int> ended{0};
  std::promise<void> all;
  for (int i = 0; i < ITEMS; ++i) {
    pool->QueueWorkItem([&] {
      right += Exchange(server.GetPort()) == "pong";
      if (++ended == ITEMS) {
        all.set_value();
      }
    });
  }
  ASSERT_EQ(all.get_future().wait_for(3 * PATIENCE), std::future_status::ready);
  EXPECT_EQ(right, ITEMS);
  EXPECT_LE(pool->GetThreadCount(), GetParam());
}

INSTANTIATE_TEST_SUITE_P(Ceilings, ThreadPoolCeiling, testing::Values(1, 2, 8, 256), testing::PrintToStringParamName());

TEST(ComputePool, IsOneForTheProcessAndNotThePoolForWorkThatBlocks) {
  EXPECT_EQ(GetComputePool(), GetComputePool());
  EXPECT_NE(GetComputePool(), GetThreadPool());
}

TEST(ComputePool, HasAtMostFourThreads) {
  const Ref<ThreadPool> pool = GetComputePool();
  EXPECT_EQ(pool->GetThreadCeiling(), 4u);
  Gate gate;
  std::vector<Ref<ScheduledItem>> items;
  for (int i = 0; i < 20; ++i) {
    items.push_back(pool->QueueWorkItem(gate.Wait()));
  }
  EXPECT_EQ(pool->GetThreadCount(), 4u);
  gate.Open();
  for (const Ref<ScheduledItem> &item : items) {
    EXPECT_TRUE(Eventually([&item] { return item->IsDone(); }));
  }
}

/// The name of the thread that runs an item of the pool.
std::string ThreadNameIn(ThreadPool &pool) {
  std::promise<std::string> name;
  pool.QueueWorkItem([&name] {
    std::array<char, 16> text{};
    pthread_getname_np(pthread_self(), text.data(), text.size());
    name.set_value(text.data());
  });
  return name.get_future().get();
}

TEST(ThreadsOfPools, HaveNamesThatShowTheirWork) {
  EXPECT_EQ(ThreadNameIn(*GetComputePool()), "tarvel-compute");
  EXPECT_EQ(ThreadNameIn(*GetThreadPool()), "tarvel-pool");
  EXPECT_EQ(ThreadNameIn(*CreateThreadPool(1)), "tarvel-pool");
}

} // namespace
} // namespace Tarvel::System
