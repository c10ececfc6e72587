// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TimeSource`, the clocks and timers of the client. An interface, so that tests can replace the time.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/system/scheduled_item.h>

#include <chrono>
#include <functional>
#include <memory>

namespace SsoClient {

/// Safe on any thread.
class TimeSource {
public:
  using SystemClock = std::chrono::system_clock;
  using SteadyClock = std::chrono::steady_clock;

  /// The time of day, exact to some milliseconds. Cheap: it is read with each `TokenSource::Get`.
  virtual SystemClock::time_point GetSystemTime() const noexcept = 0;

  virtual SteadyClock::time_point GetSteadyTime() const noexcept = 0;

  /// Calls `function` once at `time` or soon after, on an I/O thread, where it must not block. The returned item
  /// cancels the call.
  /// @throws Tarvel::InvalidStateException when there is no I/O thread and none can be started; std::bad_alloc
  virtual Tarvel::Ref<Tarvel::System::ScheduledItem> StartTimer(SteadyClock::time_point time,
                                                                std::function<void()> function) const = 0;

protected:
  TimeSource() = default;
  TimeSource(const TimeSource &) = default;
  TimeSource &operator=(const TimeSource &) = default;
  ~TimeSource() = default;
};

/// The clocks of the system and the timers of the platform.
const TimeSource &GetSystemTimeSource() noexcept;

} // namespace SsoClient
