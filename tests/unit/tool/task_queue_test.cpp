// SPDX-License-Identifier: Apache-2.0

#include "task_queue.h"

#include <gtest/gtest.h>

#include <chrono>
#include <future>
#include <memory>
#include <thread>
#include <utility>
#include <vector>

namespace SsoClient::Tool {
namespace {

TEST(TaskQueue, RunsTasksInTheirOrderUntilTheConditionIsTrue) {
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

TEST(TaskQueue, RunsTasksOfOtherThreadsOnItsOwnThread) {
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

/// Posts a task. The future becomes ready when the task is run or discarded.
std::future<int> PostPromise(TaskQueue &tasks) {
  auto promise = std::make_shared<std::promise<int>>();
  std::future<int> result = promise->get_future();
  tasks.Post([promise = std::move(promise)] { promise->set_value(1); });
  return result;
}

bool IsDiscarded(const std::future<int> &result) {
  return result.wait_for(std::chrono::seconds(0)) == std::future_status::ready;
}

TEST(TaskQueue, DiscardsTasksWhenItIsClosedAndAfterwards) {
  TaskQueue tasks;
  const std::future<int> before = PostPromise(tasks);
  EXPECT_FALSE(IsDiscarded(before));
  tasks.Close();
  EXPECT_TRUE(IsDiscarded(before));
  EXPECT_TRUE(IsDiscarded(PostPromise(tasks)));
}

} // namespace
} // namespace SsoClient::Tool
