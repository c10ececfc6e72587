// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ManualTime`, clocks and timers that a test moves.

#pragma once

#include "client/time_source.h"

#include <map>
#include <mutex>
#include <utility>

namespace Testing {

/// A timer that the test runs.
class ManualTimer final : public Tarvel::System::ScheduledItem {
public:
  explicit ManualTimer(std::function<void()> function) : m_function(std::move(function)) {}

  void Cancel() noexcept override;
  bool IsDone() const noexcept override;
  void Run();

private:
  std::function<void()> Take();

  mutable std::mutex m_mutex; // guards all that follows
  std::function<void()> m_function;
};

/// Safe on any thread. Both clocks begin at fixed times.
class ManualTime final : public SsoClient::TimeSource {
public:
  SystemClock::time_point GetSystemTime() const noexcept override;
  SteadyClock::time_point GetSteadyTime() const noexcept override;
  Tarvel::Ref<Tarvel::System::ScheduledItem> StartTimer(SteadyClock::time_point time,
                                                        std::function<void()> function) const override;

  /// Lets time pass on both clocks, and calls the functions of the timers at their times, on this thread.
  void Advance(std::chrono::nanoseconds time);

  /// Sets the wall clock only.
  void SetWallClock(std::chrono::nanoseconds later);

  /// Makes the next timers fail to start.
  void RefuseTimers(bool isRefused) { m_isRefused = isRefused; }

  /// How many timers wait.
  std::size_t CountTimers() const;

private:
  bool RunNextUntil(SteadyClock::time_point end);

  mutable std::mutex m_mutex; // guards all that follows
  SystemClock::time_point m_system{std::chrono::hours(24 * 365 * 55)};
  SteadyClock::time_point m_steady{std::chrono::hours(24)};
  mutable std::multimap<SteadyClock::time_point, Tarvel::Ref<ManualTimer>> m_timers;
  bool m_isRefused = false;
};

} // namespace Testing
