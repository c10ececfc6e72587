// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TaskQueue`, functions that other threads have the main thread run.

#pragma once

#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>

namespace SsoClient::Tool {

/// `Post` is safe on any thread. Prompts, for example, must be shown by the main thread (see `QuietTerminal`).
class TaskQueue {
public:
  /// Has `task` run, or, after `Close`, discards it.
  void Post(std::function<void()> task);

  /// Runs tasks on this thread, and waits for more, until one of them has set `isDone`.
  void RunUntil(const bool &isDone);

  /// Discards the tasks that have not been run, and those that are posted later.
  void Close();

private:
  std::mutex m_mutex;
  std::condition_variable m_posted;
  std::deque<std::function<void()>> m_tasks;
  bool m_isClosed = false;
};

} // namespace SsoClient::Tool
