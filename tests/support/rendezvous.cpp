// SPDX-License-Identifier: Apache-2.0

#include "support/rendezvous.h"

#include <chrono>

namespace Testing {

namespace {

/// Far longer than any wait here takes, even under a sanitizer on a busy machine.
constexpr std::chrono::seconds PATIENCE{120};

} // namespace

void EventCount::Add() {
  const std::lock_guard<std::mutex> lock(m_mutex);
  ++m_count;
  m_changed.notify_all();
}

bool EventCount::WaitFor(int count) const {
  std::unique_lock<std::mutex> lock(m_mutex);
  return m_changed.wait_for(lock, PATIENCE, [&] { return m_count >= count; });
}

int EventCount::Get() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_count;
}

void Gate::Pass() {
  m_arrived.Add();
  std::unique_lock<std::mutex> lock(m_mutex);
  m_opened.wait_for(lock, PATIENCE, [this] { return m_isOpen; });
}

void Gate::Open() {
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_isOpen = true;
  m_opened.notify_all();
}

} // namespace Testing
