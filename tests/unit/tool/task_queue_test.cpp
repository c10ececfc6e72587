// SPDX-License-Identifier: Apache-2.0

#include "task_queue.h"

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <thread>
#include <vector>

namespace SsoClient::Tool {
namespace {

TEST(TaskQueue, RunsTasksInTheirOrderUntilOneIsTheLast) {
  TaskQueue tasks;
  bool isDone = false;
  std::vector<int> run;
  tasks.Post([&] { run.push_back(1); });
  tasks.Post([&] {
    run.push_back(2);
    isDone = true;
  });
  tasks.Post([&] { run.push_back(3); });
  tasks.RunUntil(isDone);
  EXPECT_EQ((std::vector<int>{1, 2}), run);
}

TEST(TaskQueue, RunsTasksOfOtherThreadsOnItsOwn) {
  TaskQueue tasks;
  bool isDone = false;
  std::thread::id ran;
  std::thread other([&] {
    tasks.Post([&] {
      ran = std::this_thread::get_id();
      isDone = true;
    });
  });
  tasks.RunUntil(isDone);
  other.join();
  EXPECT_EQ(std::this_thread::get_id(), ran);
}

TEST(TaskQueue, DiscardsTasksWhenItIsClosedAndAfterwards) {
  TaskQueue tasks;
  for (const bool isClosedBefore : {false, true}) {
    auto promise = std::make_shared<std::promise<int>>();
    std::future<int> result = promise->get_future();
    if (isClosedBefore) {
      tasks.Close();
    }
    tasks.Post([promise = std::move(promise)] { promise->set_value(1); });
    tasks.Close();
    EXPECT_THROW(result.get(), std::future_error);
  }
}

} // namespace
} // namespace SsoClient::Tool
