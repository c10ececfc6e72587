// SPDX-License-Identifier: Apache-2.0
/// @file
/// `fork` beside our own threads: it waits for the moments in which a copy of this process could not go on.
///
/// A child has only the thread that forked. A lock that another thread held at that moment, of our own or inside OpenSSL,
/// stays locked there for ever. So each thread says when it computes, `fork` waits until none does, and a thread that
/// would begin meanwhile waits for `fork`. Nobody computes while it waits for the network or while it runs the host's code.

#pragma once

#include <mutex>

namespace Tarvel::System {

/// While one lives, `fork` on another thread waits. Any number may live on one thread at once. It must not be held
/// while waiting for the network, for another thread or for the host's code.
class Computation {
public:
  Computation() noexcept;
  Computation(const Computation &) = delete;
  Computation &operator=(const Computation &) = delete;
  ~Computation();
};

/// Around a call of a function that the host gave: for as long as it lives, the calling thread does not count as
/// computing, whatever it has begun, so the host may fork there, or wait for a thread that forks. No lock of our own may be
/// held.
class HostCall {
public:
  HostCall() noexcept;
  HostCall(const HostCall &) = delete;
  HostCall &operator=(const HostCall &) = delete;
  ~HostCall();

private:
  const unsigned m_suspended; // how many computations the thread had begun
};

/// A mutex whose holder computes, so that no child finds it locked. With `std::condition_variable_any` it is free while
/// its holder waits.
class ForkSafeMutex {
public:
  void lock();
  void unlock() noexcept;

private:
  std::mutex m_mutex;
};

/// How many forks lie between the process that first used the platform and this one. What was made under another number
/// belongs to a parent: its threads are not here, and what it shares with the parent must not be touched.
unsigned GetForkGeneration() noexcept;

/// What has to act when the process forks.
class ForkListener {
public:
  /// Has the threads of this object stop computing soon. Called on the forking thread, while others still compute.
  virtual void BeforeFork() noexcept = 0;
  /// No other thread computes now.
  virtual void AtFork() noexcept = 0;
  virtual void AfterForkInParent() noexcept = 0;
  /// Called in the child, where there is no other thread.
  virtual void AfterForkInChild() noexcept = 0;

protected:
  ~ForkListener() = default;
};

/// Has `listener`, which lives as long as the process, act at each later fork, in the place of an earlier listener. Called by
/// a thread that computes.
void SetForkListener(ForkListener *listener) noexcept;

/// Whether a thread waits in `fork` for the computations to end: for tests.
bool IsForkUnderWay() noexcept;

} // namespace Tarvel::System
