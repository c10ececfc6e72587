// SPDX-License-Identifier: Apache-2.0
/// @file
/// Where threads of a test meet: a count of events, and a gate that holds them up. All waiting is bounded.

#pragma once

#include <chrono>
#include <condition_variable>
#include <mutex>

namespace Testing {

/// Far longer than anything that is waited for here, also under a sanitizer on a machine that is busy.
constexpr std::chrono::seconds RENDEZVOUS_PATIENCE{120};

/// Counts what happens on any thread.
class EventCount {
public:
  void Add() {
    const std::lock_guard<std::mutex> lock(m_mutex);
    ++m_count;
    m_changed.notify_all();
  }

  /// Whether there have been that many at least, which is waited for.
  bool WaitFor(int count) const {
    std::unique_lock<std::mutex> lock(m_mutex);
    return m_changed.wait_for(lock, RENDEZVOUS_PATIENCE, [&] { return m_count >= count; });
  }

  int Get() const {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_count;
  }

private:
  mutable std::mutex m_mutex;
  mutable std::condition_variable m_changed;
  int m_count = 0;
};

/// Closed at first: who passes waits until it is open.
class Gate {
public:
  void Pass() {
    m_arrived.Add();
    std::unique_lock<std::mutex> lock(m_mutex);
    m_opened.wait_for(lock, RENDEZVOUS_PATIENCE, [this] { return m_isOpen; });
  }

  void Open() {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_isOpen = true;
    m_opened.notify_all();
  }

  /// Whether that many have come to the gate, which is waited for.
  bool WaitForArrivals(int count) const { return m_arrived.WaitFor(count); }

private:
  EventCount m_arrived;
  std::mutex m_mutex;
  std::condition_variable m_opened;
  bool m_isOpen = false;
};

} // namespace Testing
