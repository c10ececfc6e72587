// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SteppedTime`, clocks and timers that move only when a test calls `Advance`.

#pragma once

#include "client/time_source.h"

#include <tarvel/core/ref.h>
#include <tarvel/system/scheduled_item.h>

#include <chrono>
#include <functional>
#include <mutex>
#include <utility>
#include <vector>

namespace Testing {

/// Safe on any thread.
class SteppedTime final : public SsoClient::TimeSource {
public:
  SystemClock::time_point GetSystemTime() const noexcept override {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return SystemClock::time_point(std::chrono::seconds(1577836800) + m_passed); // 2020-01-01
  }
  SteadyClock::time_point GetSteadyTime() const noexcept override {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return SteadyClock::time_point(std::chrono::hours(1) + m_passed);
  }
  Tarvel::Ref<Tarvel::System::ScheduledItem> StartTimer(SteadyClock::time_point time,
                                                        std::function<void()> function) const override {
    const auto timer = Tarvel::MakeRef<Timer>(time, std::move(function));
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_timers.push_back(timer);
    return timer;
  }

  /// Lets time pass, and calls the functions of the timers that are due, on this thread.
  void Advance(std::chrono::milliseconds time) {
    {
      const std::lock_guard<std::mutex> lock(m_mutex);
      m_passed += time;
    }
    const SteadyClock::time_point now = GetSteadyTime();
    for (const Tarvel::Ref<Timer> &timer : GetTimers()) {
      if (timer->time <= now) {
        timer->Run();
      }
    }
  }

  /// How many timers have neither run nor been cancelled.
  int CountTimers() const {
    int count = 0;
    for (const Tarvel::Ref<Timer> &timer : GetTimers()) {
      count += timer->IsDone() ? 0 : 1;
    }
    return count;
  }

private:
  class Timer final : public Tarvel::System::ScheduledItem {
  public:
    Timer(SteadyClock::time_point timeOfTimer, std::function<void()> function)
        : time(timeOfTimer), m_function(std::move(function)) {}
    void Cancel() noexcept override { Take(); }
    bool IsDone() const noexcept override {
      const std::lock_guard<std::mutex> lock(m_mutex);
      return !m_function;
    }
    void Run() {
      if (const std::function<void()> function = Take()) {
        function();
      }
    }

    const SteadyClock::time_point time;

  private:
    std::function<void()> Take() {
      const std::lock_guard<std::mutex> lock(m_mutex);
      return std::exchange(m_function, nullptr);
    }

    mutable std::mutex m_mutex;
    std::function<void()> m_function;
  };

  std::vector<Tarvel::Ref<Timer>> GetTimers() const {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_timers;
  }

  mutable std::mutex m_mutex; // guards what follows
  std::chrono::milliseconds m_passed{0};
  mutable std::vector<Tarvel::Ref<Timer>> m_timers;
};

} // namespace Testing
