// SPDX-License-Identifier: Apache-2.0

#include "task_queue.h"

#include <utility>

namespace SsoClient::Tool {

void TaskQueue::Post(std::function<void()> task) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  if (!m_isClosed) {
    m_tasks.push_back(std::move(task));
    m_posted.notify_one();
  }
}

void TaskQueue::RunUntil(const bool &isDone) {
  while (!isDone) {
    std::function<void()> task;
    {
      std::unique_lock<std::mutex> lock(m_mutex);
      m_posted.wait(lock, [this] { return !m_tasks.empty(); });
      task = std::move(m_tasks.front());
      m_tasks.pop_front();
    }
    task();
  }
}

void TaskQueue::Close() {
  std::deque<std::function<void()>> discarded;
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_isClosed = true;
  discarded.swap(m_tasks);
}

} // namespace SsoClient::Tool
