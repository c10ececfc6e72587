// SPDX-License-Identifier: Apache-2.0
/// @file
/// Synchronises the threads of a test: a count of events, and a gate that stops threads. All waiting is bounded.

#pragma once

#include <condition_variable>
#include <mutex>

namespace Testing {

/// Counts events on any thread.
class EventCount {
public:
  void Add();

  /// Waits until there have been at least that many; false when that takes too long.
  bool WaitFor(int count) const;

  int Get() const;

private:
  mutable std::mutex m_mutex;
  mutable std::condition_variable m_changed;
  int m_count = 0;
};

/// Closed at first: threads that pass wait until it is open.
class Gate {
public:
  void Pass();

  void Open();

  /// Waits until that many threads have arrived; false when that takes too long.
  bool WaitForArrivals(int count) const { return m_arrived.WaitFor(count); }

private:
  EventCount m_arrived;
  std::mutex m_mutex;
  std::condition_variable m_opened;
  bool m_isOpen = false;
};

} // namespace Testing
