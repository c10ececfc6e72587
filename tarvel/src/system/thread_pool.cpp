// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/thread_pool.h>

#include "core/fork_gate.h"
#include "service/uncaught_exception.h"
#include "system/background_thread.h"
#include "system/thread_pool.h"

#include <tarvel/core/exception.h>

#include <algorithm>
#include <atomic>
#include <condition_variable>
#include <iterator>
#include <list>
#include <memory>
#include <mutex>
#include <thread>
#include <utility>

namespace Tarvel::System {

namespace {

constexpr std::chrono::seconds DEFAULT_IDLE_TIME{10};
constexpr std::chrono::milliseconds MAX_IDLE_TIME = std::chrono::hours(24 * 365); // adding it to a time never overflows

class WorkItem;
using WorkQueue = std::list<Ref<WorkItem>>;

/// Keeps the thread objects of a parent process for ever: in this process they can be neither joined nor detached, so
/// they cannot be destroyed.
void KeepThreadsOfParent(std::list<std::thread> &threads) {
  struct Kept {
    ForkSafeMutex mutex;
    std::list<std::thread> threads; // guarded by mutex
  };
  const Computation computing;
  static Kept *const kept = new Kept;
  const std::lock_guard<ForkSafeMutex> lock(kept->mutex);
  kept->threads.splice(kept->threads.end(), threads);
}

/// What the pool object, its threads and its items share; it lives as long as the last of them.
struct PoolState {
  PoolState(std::size_t threadCeiling, std::chrono::milliseconds threadIdleTime, bool isEndlessPool,
            const char *nameOfThreads)
      : ceiling(threadCeiling), idleTime(std::min(threadIdleTime, MAX_IDLE_TIME)), isEndless(isEndlessPool),
        threadName(nameOfThreads) {}
  PoolState(const PoolState &) = delete;
  PoolState &operator=(const PoolState &) = delete;
  ~PoolState() {
    if (IsOfParent()) {
      KeepThreadsOfParent(threads);
      KeepThreadsOfParent(retired);
    }
  }

  /// Whether this is the copy of a parent's state. The threads that it counts do not exist in this process.
  bool IsOfParent() const noexcept { return generation != GetForkGeneration(); }

  const unsigned generation = GetForkGeneration();
  const std::size_t ceiling;
  const std::chrono::milliseconds idleTime;
  const bool isEndless;
  const char *const threadName;

  ForkSafeMutex mutex; // guards all that follows
  std::condition_variable_any changed;
  WorkQueue urgent; // starts before `queue`
  WorkQueue queue;
  std::list<std::thread> threads;
  std::list<std::thread> retired; // ended or about to end; joined by the next thread that retires, or by the destructor
  std::size_t idle = 0;
  bool ended = false;

  // Called under the lock.
  std::size_t CountQueued() const noexcept { return urgent.size() + queue.size(); }
  /// The first item that is queued; null when both queues are empty.
  Ref<WorkItem> GetFirstQueued() const noexcept;
};

/// The pool that the calling thread belongs to; null on a thread that belongs to no pool.
thread_local const PoolState *currentPool = nullptr;

class WorkItem final : public ScheduledItem {
public:
  WorkItem(std::shared_ptr<PoolState> pool, WorkQueue PoolState::*queue, std::function<void()> work)
      : m_pool(std::move(pool)), m_queue((*m_pool).*queue), m_work(std::move(work)) {}

  void Cancel() noexcept override {
    const Ref<WorkItem> self(this); // the queue's reference may be the last
    std::function<void()> work;     // destroyed outside the lock: it may own any object
    {
      const std::lock_guard<ForkSafeMutex> lock(m_pool->mutex);
      if (m_stage != Stage::QUEUED) {
        return;
      }
      m_stage = Stage::DONE;
      m_queue.erase(m_place);
      work.swap(m_work);
    }
  }

  /// A child never runs what its parent has queued.
  bool IsDone() const noexcept override { return m_stage == Stage::DONE || m_pool->IsOfParent(); }

  /// Called under the pool's lock.
  void Enqueue() { m_place = m_queue.insert(m_queue.end(), Ref<WorkItem>(this)); }
  void Dequeue() noexcept {
    m_queue.erase(m_place);
    m_stage = Stage::RUNNING;
  }

  /// Called once, after `Dequeue`.
  void Run() noexcept {
    try {
      m_work();
    } catch (...) {
      Service::LogUncaughtException("a work item of the thread pool");
    }
    m_work = nullptr;
    m_stage = Stage::DONE;
  }

private:
  enum class Stage { QUEUED, RUNNING, DONE };

  const std::shared_ptr<PoolState> m_pool;
  WorkQueue &m_queue; // of the pool
  std::function<void()> m_work;
  WorkQueue::iterator m_place; // while queued
  std::atomic<Stage> m_stage{Stage::QUEUED};
};

Ref<WorkItem> PoolState::GetFirstQueued() const noexcept {
  const WorkQueue &first = urgent.empty() ? queue : urgent;
  return first.empty() ? Ref<WorkItem>() : first.front();
}

// Constant-initialised and never destroyed.
std::atomic<ThreadEndHook> threadEndHook{nullptr};

/// Whether the calling thread, which is idle, may end now.
bool MayEnd(const PoolState &pool) noexcept {
  const ThreadEndHook hook = pool.isEndless ? threadEndHook.load() : nullptr;
  return !hook || hook();
}

/// The next item to run; null when the thread has been idle for long enough, or the pool has ended.
Ref<WorkItem> WaitForWork(PoolState &pool, std::unique_lock<ForkSafeMutex> &lock) {
  ++pool.idle;
  while (!pool.changed.wait_for(lock, pool.idleTime, [&pool] { return pool.ended || pool.CountQueued() > 0; }) &&
         !MayEnd(pool)) {
  }
  --pool.idle;
  Ref<WorkItem> item = pool.ended ? Ref<WorkItem>() : pool.GetFirstQueued();
  if (item) {
    item->Dequeue();
  }
  return item;
}

/// Removes the calling thread from the pool's list, and joins those that retired before it. A thread of an endless pool
/// is detached instead.
void Retire(PoolState &pool, std::list<std::thread>::iterator self, std::unique_lock<ForkSafeMutex> &lock) {
  std::list<std::thread> earlier;
  if (pool.isEndless) {
    self->detach();
    pool.threads.erase(self);
    return;
  }
  earlier.swap(pool.retired);
  pool.retired.splice(pool.retired.end(), pool.threads, self);
  lock.unlock();
  for (std::thread &thread : earlier) {
    thread.join();
  }
}

void RunThread(const std::shared_ptr<PoolState> &pool, std::list<std::thread>::iterator self) {
  currentPool = pool.get();
  std::unique_lock<ForkSafeMutex> lock(pool->mutex);
  while (Ref<WorkItem> item = WaitForWork(*pool, lock)) {
    lock.unlock();
    item->Run();
    item.reset();
    if (pool->IsOfParent()) {
      return; // the item forked, and this is the thread's copy in the child
    }
    lock.lock();
  }
  if (!pool->ended) {
    Retire(*pool, self, lock);
  }
}

/// Called under the pool's lock.
void AddThread(const std::shared_ptr<PoolState> &pool) {
  const auto self = pool->threads.emplace(pool->threads.end());
  try {
    *self = StartBackgroundThread(pool->threadName, [pool, self] { RunThread(pool, self); });
  } catch (...) {
    pool->threads.erase(self);
    throw;
  }
}

Ref<WorkItem> LockAndGetFirstQueued(PoolState &pool) {
  const std::lock_guard<ForkSafeMutex> lock(pool.mutex);
  return pool.GetFirstQueued();
}

void CancelQueued(PoolState &pool) {
  while (const Ref<WorkItem> item = LockAndGetFirstQueued(pool)) {
    item->Cancel();
  }
}

class ThreadPoolImpl final : public ThreadPool {
public:
  ThreadPoolImpl(std::size_t threadCeiling, std::chrono::milliseconds idleTime, bool isEndless, const char *threadName)
      : m_state(std::make_shared<PoolState>(std::max<std::size_t>(threadCeiling, 1), idleTime, isEndless, threadName)) {
  }

  Ref<ScheduledItem> QueueWorkItem(std::function<void()> work) override {
    return Enqueue(&PoolState::queue, std::move(work));
  }

  Ref<ScheduledItem> QueueUrgentItem(std::function<void()> work) override {
    return Enqueue(&PoolState::urgent, std::move(work));
  }

  std::size_t GetThreadCeiling() const noexcept override {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    return m_state->ceiling;
  }

  std::size_t GetThreadCount() const noexcept override {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    const std::lock_guard<ForkSafeMutex> stateLock(m_state->mutex);
    return m_state->IsOfParent() ? 0 : m_state->threads.size();
  }

private:
  ~ThreadPoolImpl() override {
    std::list<std::thread> threads = m_state->IsOfParent() ? std::list<std::thread>() : EndThreads();
    CancelQueued(*m_state);
    for (std::thread &thread : threads) {
      // A thread of the pool cannot wait for itself, nor for another one that may wait for it.
      if (currentPool == m_state.get()) {
        thread.detach();
      } else {
        thread.join();
      }
    }
  }

  Ref<ScheduledItem> Enqueue(WorkQueue PoolState::*queue, std::function<void()> work) {
    const std::shared_ptr<PoolState> state = GetState();
    const Ref<WorkItem> item = MakeRef<WorkItem>(state, queue, std::move(work));
    {
      const std::lock_guard<ForkSafeMutex> lock(state->mutex);
      item->Enqueue();
      if (state->CountQueued() > state->idle && state->threads.size() < state->ceiling) {
        StartThreadFor(*item, state);
      }
    }
    state->changed.notify_one(); // after the lock is released: otherwise the woken thread would wait for it at once
    return item;
  }

  /// Makes the threads end, and returns them to be joined.
  std::list<std::thread> EndThreads() noexcept {
    std::list<std::thread> threads;
    {
      const std::lock_guard<ForkSafeMutex> lock(m_state->mutex);
      m_state->ended = true;
      threads.splice(threads.end(), m_state->threads);
      threads.splice(threads.end(), m_state->retired);
    }
    m_state->changed.notify_all();
    return threads;
  }

  /// The state of this process's pool. In a child process it is a new one, and the parent's queue is dropped.
  std::shared_ptr<PoolState> GetState() {
    std::shared_ptr<PoolState> state;
    std::shared_ptr<PoolState> ofParent;
    {
      const std::lock_guard<ForkSafeMutex> lock(m_mutex);
      if (m_state->IsOfParent()) {
        ofParent = std::exchange(m_state, std::make_shared<PoolState>(m_state->ceiling, m_state->idleTime,
                                                                      m_state->isEndless, m_state->threadName));
      }
      state = m_state;
    }
    if (ofParent) {
      CancelQueued(*ofParent);
    }
    return state;
  }

  /// Called under the pool's lock. Throws only when no thread can be started and the pool has none: the item would
  /// wait for ever.
  static void StartThreadFor(WorkItem &item, const std::shared_ptr<PoolState> &state) {
    try {
      AddThread(state);
    } catch (...) {
      if (state->threads.empty()) {
        item.Dequeue();
        throw;
      }
    }
  }

  mutable ForkSafeMutex m_mutex;
  std::shared_ptr<PoolState> m_state; // guarded by m_mutex
};

} // namespace

ThreadPool::~ThreadPool() = default;

Ref<ThreadPool> GetThreadPool() {
  const Computation computing;
  // Never destroyed: its threads outlive static objects and are never joined.
  static ThreadPool *const pool = CreateEndlessThreadPool(DEFAULT_THREAD_CEILING, DEFAULT_IDLE_TIME).Detach();
  return Ref<ThreadPool>(pool);
}

Ref<ThreadPool> GetComputePool() {
  const Computation computing;
  static ThreadPool *const pool =
      CreateEndlessThreadPool(COMPUTE_THREAD_CEILING, DEFAULT_IDLE_TIME, "tarvel-compute").Detach();
  return Ref<ThreadPool>(pool);
}

Ref<ThreadPool> CreateThreadPool(std::size_t threadCeiling, std::chrono::milliseconds idleTime) {
  return MakeRef<ThreadPoolImpl>(threadCeiling, idleTime, false, POOL_THREAD_NAME);
}

Ref<ThreadPool> CreateEndlessThreadPool(std::size_t threadCeiling, std::chrono::milliseconds idleTime,
                                        const char *threadName) {
  return MakeRef<ThreadPoolImpl>(threadCeiling, idleTime, true, threadName);
}

ThreadEndHook SetThreadEndHook(ThreadEndHook hook) noexcept {
  return threadEndHook.exchange(hook);
}

} // namespace Tarvel::System
