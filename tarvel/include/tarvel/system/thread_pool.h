// SPDX-License-Identifier: Apache-2.0
/// @file
/// The thread pool for work that blocks.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/system/scheduled_item.h>

#include <chrono>
#include <cstddef>
#include <functional>

namespace Tarvel::System {

/// Runs queued functions on threads of its own. Threads are made on demand up to a ceiling and end when they have been
/// idle for a while. Only memory bounds the queue. Network completions never run here, so work that waits for the
/// network cannot block its own completion, however low the ceiling is. Safe on any thread.
///
/// A child process made by `fork` may use the pools of its parent; they start threads there. Work that the parent has
/// queued never runs in the child, and counts as done.
class TARVEL_API ThreadPool : public Object {
public:
  /// Queues `work` for one run and returns at once. These items start in the order in which they are queued. An exception
  /// that `work` throws is logged (logger "Tarvel", level 8) and ends that item only. `work` and what it captures
  /// are destroyed on the pool's thread after the run, or on the thread that removes a cancelled item from the queue.
  ///
  /// `work` must not wait for another item of the pool: when as many items wait as the pool may have threads, the items
  /// that they wait for never start. Let the work that ends last queue the next item.
  /// @throws InvalidStateException when the pool has no thread and none can be started; `work` is then never run.
  virtual Ref<ScheduledItem> QueueWorkItem(std::function<void()> work) = 0;

  /// The same, but the item starts before all that `QueueWorkItem` has queued. For the ends of operations, so that they
  /// need not wait until the work of others has been done.
  virtual Ref<ScheduledItem> QueueUrgentItem(std::function<void()> work) = 0;

  /// How many threads the pool may have at most.
  virtual std::size_t GetThreadCeiling() const noexcept = 0;

  /// How many threads the pool has now.
  virtual std::size_t GetThreadCount() const noexcept = 0;

protected:
  ~ThreadPool() override;
};

/// How many threads the process's pool has at most: far more than there are cores, because work that waits for a
/// four-minute request must not delay other work. A thread costs little while it waits.
constexpr std::size_t DEFAULT_THREAD_CEILING = 256;

/// The process's pool, made on first use (no thread before the first item); it lives until the process ends.
TARVEL_API Ref<ThreadPool> GetThreadPool();

/// The maximum number of threads of the pool for computations.
constexpr std::size_t COMPUTE_THREAD_CEILING = 4;

/// The process's pool for short computations, such as composing and verifying messages: its items must not block, nor wait
/// for anything. Made on first use; it lives until the process ends.
TARVEL_API Ref<ThreadPool> GetComputePool();

/// A separate pool; its ceiling is at least one thread. Releasing the last reference ends the pool: it drops the work
/// in the queue and waits for running work. If work of the pool itself releases the last reference, running work is not
/// waited for, and ends by itself.
TARVEL_API Ref<ThreadPool> CreateThreadPool(std::size_t threadCeiling,
                                            std::chrono::milliseconds idleTime = std::chrono::seconds(10));

} // namespace Tarvel::System
