// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TaskQueue`, with which other threads run functions on the main thread.

#pragma once

#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>

namespace SsoClient::Tool {

/// Functions that one thread runs for the others. In the tool this is the main thread, because only it may show prompts
/// (see `QuietTerminal`). `Post` is safe on any thread.
class TaskQueue {
public:
  /// Queues `task`, or discards it after `Close`.
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
