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
/// idle for a while. The queue is bounded by memory alone. Network completions never run here, so work that waits for
/// the network cannot starve itself, whatever the ceiling. Safe on any thread.
///
/// A child process made by `fork` may use the pools of its parent: they have threads of its own there. What the parent has
/// queued never runs in the child, and counts as done.
class TARVEL_API ThreadPool : public Object {
public:
  /// Queues `work` for one run and returns at once. Items start in the order in which they are queued. An exception
  /// that leaves `work` is logged (logger "Tarvel", level 8) and ends that item only. `work` and what it holds are
  /// destroyed on the pool's thread after the run, or wherever a cancelled item is taken out of the queue.
  ///
  /// `work` must not wait for another item of the pool: when as many items wait as the pool may have threads, none that
  /// they wait for ever starts. Let the last piece of work queue what comes next.
  /// @throws InvalidStateException when the pool has no thread and none can be started; `work` is then never run.
  virtual Ref<ScheduledItem> QueueWorkItem(std::function<void()> work) = 0;

  /// How many threads the pool may have at most.
  virtual std::size_t GetThreadCeiling() const noexcept = 0;

  /// How many threads the pool has now.
  virtual std::size_t GetThreadCount() const noexcept = 0;

protected:
  ~ThreadPool() override;
};

/// How many threads the process's pool has at the most. Work that blocks on a four-minute request must not hold up
/// other work, hence far more than there are cores; a thread costs little while it waits.
constexpr std::size_t DEFAULT_THREAD_CEILING = 256;

/// The process's pool, made on first use (no thread before the first item); it lives until the process ends.
TARVEL_API Ref<ThreadPool> GetThreadPool();

/// A pool of one's own, at least one thread at the ceiling. Dropping the last reference ends it: what is queued is
/// dropped, what runs is waited for (unless the reference is dropped by the pool's own work, which is then left to
/// finish).
TARVEL_API Ref<ThreadPool> CreateThreadPool(std::size_t threadCeiling,
                                            std::chrono::milliseconds idleTime = std::chrono::seconds(10));

} // namespace Tarvel::System
