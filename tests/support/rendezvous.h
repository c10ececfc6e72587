// SPDX-License-Identifier: Apache-2.0
/// @file
/// Where threads of a test meet: a count of events, and a gate that holds them up. All waiting is bounded.

#pragma once

#include <condition_variable>
#include <mutex>

namespace Testing {

/// Counts what happens on any thread.
class EventCount {
public:
  void Add();

  /// Whether there have been that many at least, which is waited for.
  bool WaitFor(int count) const;

  int Get() const;

private:
  mutable std::mutex m_mutex;
  mutable std::condition_variable m_changed;
  int m_count = 0;
};

/// Closed at first: who passes waits until it is open.
class Gate {
public:
  void Pass();

  void Open();

  /// Whether that many have come to the gate, which is waited for.
  bool WaitForArrivals(int count) const { return m_arrived.WaitFor(count); }

private:
  EventCount m_arrived;
  std::mutex m_mutex;
  std::condition_variable m_opened;
  bool m_isOpen = false;
};

} // namespace Testing
