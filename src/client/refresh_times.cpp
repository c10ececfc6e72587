// SPDX-License-Identifier: Apache-2.0

#include "client/refresh_times.h"

#include <tarvel/system/date_time.h>

#include <algorithm>
#include <cstdlib>

namespace SsoClient {

namespace {

using std::chrono::microseconds;

/// Nothing is planned for later, because nanoseconds in 64 bits end after 292 years.
constexpr std::int64_t LONGEST_TIME = std::int64_t{10} * 365 * 24 * 3600 * Tarvel::System::MICROSECONDS_PER_SECOND;

/// The margin is at most this part of the lifetime.
constexpr std::int64_t MARGIN_PARTS = 10;

/// The time on the steady clock at which the wall clock is `system`, unless the wall clock is set in between.
RefreshTimes::SteadyTime ToSteady(std::int64_t system, const Moment &now) noexcept {
  return now.steady + microseconds(std::clamp(system - now.system, -LONGEST_TIME, LONGEST_TIME));
}

} // namespace

Moment ReadClocks(const TimeSource &time) noexcept {
  const auto sinceEpoch = time.GetSystemTime().time_since_epoch();
  return {std::chrono::duration_cast<microseconds>(sinceEpoch).count(), time.GetSteadyTime()};
}

RefreshTimes PlanRefresh(const SamlToken &token, const Moment &now, bool isIssued, const TokenSourceOptions &options,
                         double random) {
  const std::int64_t start = token.GetStartDate().GetUtcTime();
  RefreshTimes times;
  times.end = token.GetEndDate().GetUtcTime();
  const std::int64_t margin = std::min(microseconds(options.expiryMargin).count(), (times.end - start) / MARGIN_PARTS);
  // The clock of the service may be ahead, so an accepted token is usable from now on. The margin allows for a clock
  // that is set back here by as much.
  times.usableFrom = std::min(start, now.system) - margin;
  times.usableUntil = times.end - margin;
  // Without this, each new token would be due at once if the clock of the service were slow.
  const std::int64_t base = isIssued ? std::max(start, now.system) : start;
  const double part = options.refreshAt - options.jitter * random;
  const std::int64_t due = base + static_cast<std::int64_t>(part * static_cast<double>(times.end - base));
  times.dueAt = std::min(due, times.usableUntil);
  times.steadyDueAt = ToSteady(times.dueAt, now);
  times.steadyUntil = ToSteady(times.usableUntil, now);
  return times;
}

std::chrono::nanoseconds GetBackOff(int failures, const TokenSourceOptions &options, double random) noexcept {
  std::chrono::nanoseconds delay = options.firstBackOff;
  const std::chrono::nanoseconds longest = options.longestBackOff;
  for (int doubled = 1; doubled < failures && delay < longest; ++doubled) {
    delay *= 2;
  }
  return std::chrono::nanoseconds(
      static_cast<std::int64_t>(static_cast<double>(std::min(delay, longest).count()) * (1 - random / 2)));
}

} // namespace SsoClient
