// SPDX-License-Identifier: Apache-2.0

#include "core/fork_gate.h"

#include "core/thread_shard.h"

#include <array>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <pthread.h>
#include <thread>
#include <unistd.h>
#include <utility>

namespace Tarvel {

namespace {

constexpr std::chrono::microseconds WAIT_STEP{50};
/// The most steps that a thread waits when it forks within its own computation. Other threads may wait for a lock that
/// it holds, and would never stop computing.
constexpr int MAX_STEPS_WITHIN = 2000;

/// The number of threads of one shard that compute: a single counter would be a point of contention.
struct alignas(SHARD_ALIGNMENT) Shard {
  std::atomic<std::uint32_t> threads{0};
};

// Constant-initialised and never destroyed. Access to `shards` and `forking` is sequentially consistent: either the
// thread that begins sees the fork, or the fork sees the thread.
constexpr std::size_t SHARDS = 16;
std::array<Shard, SHARDS> shards;
std::atomic<int> forking{0};
std::atomic<unsigned> generation{0};
std::atomic<ForkListener *> listener{nullptr};
std::mutex forks;                      // held during a fork: there is one at a time
bool isQuiet = false;                  // during a fork: no other thread computes
std::atomic<bool> isRegistered{false}; // whether the functions below are called at each fork
std::atomic<pid_t> registrar{0};       // the process in which a thread registers them, or 0

thread_local unsigned depth = 0;           // how many computations the thread has begun
thread_local bool isForkingThread = false; // that thread never waits: all others wait for it

std::atomic<std::uint32_t> &OwnShard() noexcept {
  return shards[GetThreadShard(SHARDS)].threads;
}

void BeginComputing() noexcept {
  std::atomic<std::uint32_t> &shard = OwnShard();
  for (;;) {
    shard.fetch_add(1);
    if (forking.load() == 0 || isForkingThread) {
      return;
    }
    shard.fetch_sub(1);
    forking.wait(1);
  }
}

void EndComputing() noexcept {
  OwnShard().fetch_sub(1);
}

std::uint32_t CountComputing() noexcept {
  std::uint32_t threads = 0;
  for (const Shard &shard : shards) {
    threads += shard.threads.load();
  }
  return threads;
}

/// 1 when the calling thread computes, which means that it forks within its own computation. This happens in a signal
/// handler and in a module that OpenSSL has loaded. A child of such a fork is expected to execute another program.
std::uint32_t CountOwn() noexcept {
  return depth > 0 ? 1 : 0;
}

/// Allows one fork at a time. A thread that waits for its turn does not count as computing: otherwise the fork under
/// way would wait for it.
void LockForks() noexcept {
  if (depth > 0) {
    EndComputing();
  }
  forks.lock();
  if (depth > 0) {
    OwnShard().fetch_add(1);
  }
}

void BeforeFork() noexcept {
  LockForks();
  isForkingThread = true;
  forking.store(1);
  ForkListener *listening = nullptr;
  isQuiet = false;
  for (int step = 0; !isQuiet && (depth == 0 || step < MAX_STEPS_WITHIN); ++step) {
    // A thread that still computes may set the first listener.
    if (!listening && (listening = listener.load())) {
      listening->BeforeFork();
    }
    isQuiet = CountComputing() <= CountOwn();
    if (!isQuiet) {
      std::this_thread::sleep_for(WAIT_STEP);
    }
  }
  if (listening && isQuiet) {
    listening->AtFork();
  }
}

void EndFork() noexcept {
  isForkingThread = false;
  forking.store(0);
  forking.notify_all();
  forks.unlock();
}

void AfterForkInParent() noexcept {
  if (ForkListener *const listening = listener.load()) {
    listening->AfterForkInParent();
  }
  EndFork();
}

void AfterForkInChild() noexcept {
  generation.fetch_add(1);
  isRegistered.store(true); // the thread that registers may not have set it yet, and does not exist here
  // A thread that was about to begin may have counted itself for a moment.
  for (Shard &shard : shards) {
    shard.threads.store(0);
  }
  OwnShard().store(CountOwn());
  ForkListener *const listening = listener.exchange(nullptr);
  if (listening && isQuiet) {
    listening->AfterForkInChild();
  }
  EndFork();
}

/// Whether the calling thread must register the functions. If another thread of this process does so, waits for it. If a
/// thread of the parent did so when the parent forked, this process must do it.
bool IsToRegister() noexcept {
  const pid_t self = getpid();
  while (!isRegistered.load()) {
    pid_t process = registrar.load();
    if (process == self) {
      std::this_thread::sleep_for(WAIT_STEP);
    } else if (registrar.compare_exchange_strong(process, self)) {
      return true;
    }
  }
  return false;
}

/// Called with each computation, and when the number of forks is asked for. No thread computes before the functions are registered: a fork that began earlier would
/// not wait for it. The C library registers nothing while a fork is under way.
void RegisterOnce() noexcept {
  if (isRegistered.load(std::memory_order_acquire) || !IsToRegister()) {
    return;
  }
  if (pthread_atfork(BeforeFork, AfterForkInParent, AfterForkInChild) == 0) {
    isRegistered.store(true);
  } else {
    registrar.store(0); // no memory; the next computation tries again
  }
}

} // namespace

Computation::Computation() noexcept {
  if (depth++ == 0) {
    RegisterOnce();
    BeginComputing();
  }
}

Computation::~Computation() {
  if (--depth == 0) {
    EndComputing();
  }
}

HostCall::HostCall() noexcept : m_suspended(std::exchange(depth, 0)) {
  if (m_suspended > 0) {
    EndComputing();
  }
}

HostCall::~HostCall() {
  if (m_suspended > 0) {
    BeginComputing();
    depth = m_suspended;
  }
}

void ForkSafeMutex::lock() {
  const Computation computing; // ends the computation again if the lock fails
  m_mutex.lock();
  ++depth;
}

void ForkSafeMutex::unlock() noexcept {
  m_mutex.unlock();
  if (--depth == 0) {
    EndComputing();
  }
}

unsigned GetForkGeneration() noexcept {
  RegisterOnce(); // what is made at this number, a child must recognise, even if nothing has computed before
  return generation.load(std::memory_order_relaxed);
}

void SetForkListener(ForkListener *newListener) noexcept {
  listener.store(newListener);
}

bool IsForkUnderWay() noexcept {
  return forking.load() != 0;
}

} // namespace Tarvel
