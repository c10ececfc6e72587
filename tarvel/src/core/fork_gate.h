// SPDX-License-Identifier: Apache-2.0
/// @file
/// Makes `fork` safe in a process that runs our threads: `fork` waits until no thread holds a lock.
///
/// A child has only the thread that forked. A lock that another thread held at that moment, in our code or in
/// OpenSSL, stays locked in the child forever. So each thread declares when it computes, `fork` waits until no thread
/// does, and a thread that is about to begin waits for `fork`. A thread that waits for the network or runs the host's
/// code does not count as computing.

#pragma once

#include <tarvel/core/fork_safe_mutex.h>

namespace Tarvel {

/// While an object exists, `fork` on another thread waits. One thread may have several at once. Do not keep one
/// while you wait for the network, for another thread or for the host's code.
class Computation {
public:
  Computation() noexcept;
  Computation(const Computation &) = delete;
  Computation &operator=(const Computation &) = delete;
  ~Computation();
};

/// Surrounds a call of the host's function. While it exists, the calling thread does not count as computing, even
/// within a `Computation`, so that the host may fork there, or wait for a thread that forks. The thread must hold none
/// of our locks.
class HostCall {
public:
  HostCall() noexcept;
  HostCall(const HostCall &) = delete;
  HostCall &operator=(const HostCall &) = delete;
  ~HostCall();

private:
  const unsigned m_suspended; // how many computations the thread had begun
};

/// Acts when the process forks.
class ForkListener {
public:
  /// Makes the threads of this object stop computing soon. Called on the forking thread, while others still compute.
  virtual void BeforeFork() noexcept = 0;
  /// Called when no other thread computes. Not called if `fork` stops waiting for that.
  virtual void AtFork() noexcept = 0;
  /// Called in the parent, even if `AtFork` was not called.
  virtual void AfterForkInParent() noexcept = 0;
  /// Called in the child, where there is no other thread. Not called if `AtFork` was not called.
  virtual void AfterForkInChild() noexcept = 0;

protected:
  ~ForkListener() = default;
};

/// Makes `listener`, which must live as long as the process, act at each later fork. It replaces an earlier listener.
/// Called by a thread that computes.
void SetForkListener(ForkListener *listener) noexcept;

/// Whether a thread waits in `fork` for the computations to end. For tests.
bool IsForkUnderWay() noexcept;

} // namespace Tarvel
