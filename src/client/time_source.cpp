// SPDX-License-Identifier: Apache-2.0

#include "client/time_source.h"

#include <tarvel/system/timer.h>

#include <ctime>
#include <utility>

namespace SsoClient {

namespace {

class SystemTimeSource final : public TimeSource {
public:
  SystemClock::time_point GetSystemTime() const noexcept override {
#ifdef CLOCK_REALTIME_COARSE
    // The time of the last tick of the system, because it is read much faster.
    std::timespec time{};
    if (::clock_gettime(CLOCK_REALTIME_COARSE, &time) == 0) {
      return SystemClock::time_point(std::chrono::duration_cast<SystemClock::duration>(
          std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec)));
    }
#endif
    return SystemClock::now();
  }

  SteadyClock::time_point GetSteadyTime() const noexcept override {
    return SteadyClock::now();
  }

  Tarvel::Ref<Tarvel::System::ScheduledItem> StartTimer(SteadyClock::time_point time,
                                                        std::function<void()> function) const override {
    return Tarvel::System::StartTimer(time, std::move(function));
  }
};

} // namespace

const TimeSource &GetSystemTimeSource() noexcept {
  static const SystemTimeSource
      source; // has no state and a trivial destructor, so it may be used until the process ends
  return source;
}

} // namespace SsoClient
