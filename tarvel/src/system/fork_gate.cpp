// SPDX-License-Identifier: Apache-2.0

#include "system/fork_gate.h"

#include "system/thread_lane.h"

#include <array>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <pthread.h>
#include <thread>
#include <utility>

namespace Tarvel::System {

namespace {

constexpr std::chrono::microseconds WAIT_STEP{50};
/// How often a thread steps that forks within a computation of its own. Others may wait for what it holds, and then never end.
constexpr int MAX_STEPS_WITHIN = 2000;

/// The threads that compute, counted by lanes: one count for all would be what they queue up for.
struct alignas(LANE_ALIGNMENT) Lane {
  std::atomic<std::uint32_t> threads{0};
};

// Constant-initialised and never destroyed. Lanes and forking are sequentially consistent: either the thread that begins
// sees the fork, or the fork sees the thread.
constexpr std::size_t LANES = 16;
std::array<Lane, LANES> lanes;
std::atomic<int> forking{0};
std::atomic<unsigned> generation{0};
std::atomic<ForkListener *> listener{nullptr};
std::mutex forks;     // held during a fork: there is one at a time
bool isQuiet = false; // during a fork: nobody else computes
std::atomic<bool> registers{false};

thread_local unsigned depth = 0;           // of the computations that the thread has begun
thread_local bool isForkingThread = false; // it waits for nobody: it is the one for whom all wait

std::atomic<std::uint32_t> &OwnLane() noexcept {
  return lanes[GetThreadLane(LANES)].threads;
}

void BeginComputing() noexcept {
  std::atomic<std::uint32_t> &lane = OwnLane();
  for (;;) {
    lane.fetch_add(1);
    if (forking.load() == 0 || isForkingThread) {
      return;
    }
    lane.fetch_sub(1);
    forking.wait(1);
  }
}

void EndComputing() noexcept {
  OwnLane().fetch_sub(1);
}

std::uint32_t CountComputing() noexcept {
  std::uint32_t threads = 0;
  for (const Lane &lane : lanes) {
    threads += lane.threads.load();
  }
  return threads;
}

/// 1 when the calling thread computes, and so forks within a computation of its own: in a signal handler, or in a module that
/// OpenSSL has loaded. Such a child executes a program.
std::uint32_t CountOwn() noexcept {
  return depth > 0 ? 1 : 0;
}

/// One fork at a time. A thread that waits for its turn does not count, or it would be waited for.
void LockForks() noexcept {
  if (depth > 0) {
    EndComputing();
  }
  forks.lock();
  if (depth > 0) {
    OwnLane().fetch_add(1);
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
  // A thread that was about to begin may have counted itself for a moment.
  for (Lane &lane : lanes) {
    lane.threads.store(0);
  }
  OwnLane().store(CountOwn());
  ForkListener *const listening = listener.exchange(nullptr);
  if (listening && isQuiet) {
    listening->AfterForkInChild();
  }
  EndFork();
}

/// With the first computation, and so before the first thread of our own.
void RegisterOnce() noexcept {
  if (registers.load(std::memory_order_relaxed) || registers.exchange(true)) {
    return;
  }
  if (pthread_atfork(BeforeFork, AfterForkInParent, AfterForkInChild) != 0) {
    registers.store(false); // without memory; the next computation tries again
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
  const Computation computing; // if the lock fails, it is as if nothing had begun
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
  return generation.load(std::memory_order_relaxed);
}

void SetForkListener(ForkListener *newListener) noexcept {
  listener.store(newListener);
}

bool IsForkUnderWay() noexcept {
  return forking.load() != 0;
}

} // namespace Tarvel::System
