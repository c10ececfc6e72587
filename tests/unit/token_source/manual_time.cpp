// SPDX-License-Identifier: Apache-2.0

#include "unit/token_source/manual_time.h"

#include <tarvel/core/exception.h>

#include <algorithm>
#include <utility>

namespace Testing {

void ManualTimer::Cancel() noexcept {
  Take();
}

bool ManualTimer::IsDone() const noexcept {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return !m_function;
}

void ManualTimer::Run() {
  if (const std::function<void()> function = Take()) {
    function();
  }
}

std::function<void()> ManualTimer::Take() {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return std::exchange(m_function, nullptr);
}

SsoClient::TimeSource::SystemClock::time_point ManualTime::GetSystemTime() const noexcept {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_system;
}

SsoClient::TimeSource::SteadyClock::time_point ManualTime::GetSteadyTime() const noexcept {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_steady;
}

Tarvel::Ref<Tarvel::System::ScheduledItem> ManualTime::StartTimer(SteadyClock::time_point time,
                                                                  std::function<void()> function) const {
  const auto item = Tarvel::MakeRef<ManualTimer>(std::move(function));
  const std::lock_guard<std::mutex> lock(m_mutex);
  if (m_isRefused) {
    throw Tarvel::InvalidStateException("There is no thread for timers");
  }
  // Timers that were cancelled would pile up in a long test.
  while (!m_timers.empty() && m_timers.begin()->second->IsDone()) {
    m_timers.erase(m_timers.begin());
  }
  m_timers.emplace(time, item);
  return item;
}

void ManualTime::Advance(std::chrono::nanoseconds time) {
  SteadyClock::time_point end;
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    end = m_steady + time;
  }
  while (RunNextUntil(end)) {
  }
}

/// Runs the earliest timer at its time; if there is none until `end`, moves the clocks to `end` and returns false.
bool ManualTime::RunNextUntil(SteadyClock::time_point end) {
  Tarvel::Ref<ManualTimer> item;
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    const bool isDue = !m_timers.empty() && m_timers.begin()->first <= end;
    const SteadyClock::time_point next = isDue ? std::max(m_timers.begin()->first, m_steady) : end;
    m_system += std::chrono::duration_cast<SystemClock::duration>(next - m_steady);
    m_steady = next;
    if (!isDue) {
      return false;
    }
    item = m_timers.begin()->second;
    m_timers.erase(m_timers.begin());
  }
  item->Run();
  return true;
}

void ManualTime::SetWallClock(std::chrono::nanoseconds later) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_system += std::chrono::duration_cast<SystemClock::duration>(later);
}

std::size_t ManualTime::CountTimers() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  std::size_t count = 0;
  for (const auto &timer : m_timers) {
    count += timer.second->IsDone() ? 0U : 1U;
  }
  return count;
}

} // namespace Testing
