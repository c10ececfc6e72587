// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RefreshTimes`, the times at which a token may be returned and must be refreshed.

#pragma once

#include "client/time_source.h"

#include <ssoclient/client/token_source.h>
#include <ssoclient/saml_token.h>

#include <cstdint>

namespace SsoClient {

/// One moment, on both clocks. Only the wall clock can be compared with the dates of a token, and only the steady clock
/// is never set.
struct Moment {
  std::int64_t system = 0; ///< microseconds since 1970, UTC
  TimeSource::SteadyClock::time_point steady;
};

/// The present time on both clocks.
Moment ReadClocks(const TimeSource &time) noexcept;

/// The times of one token, computed from its own dates when it was received. If a clock is set afterwards, the token
/// may end early, but never late: it ends when either clock reaches its end.
struct RefreshTimes {
  using SteadyTime = TimeSource::SteadyClock::time_point;

  std::int64_t usableFrom = 0;
  std::int64_t dueAt = 0; ///< not after `usableUntil`
  std::int64_t usableUntil = 0;
  std::int64_t end = 0; ///< the end that the token states
  SteadyTime steadyDueAt;
  SteadyTime steadyUntil;

  /// Whether the token may be returned.
  bool IsUsable(const Moment &now) const noexcept {
    return now.system >= usableFrom && now.system < usableUntil && now.steady < steadyUntil;
  }
  /// Whether the token must be refreshed.
  bool IsDue(const Moment &now) const noexcept { return now.system >= dueAt || now.steady >= steadyDueAt; }
};

/// @param isIssued whether the token was issued now; otherwise it is from a file
/// @param random between 0 and 1; which part of the jitter is subtracted
RefreshTimes PlanRefresh(const SamlToken &token, const Moment &now, bool isIssued, const TokenSourceOptions &options,
                         double random);

/// How long no further attempt is made after `failures` failed attempts in a row; at least half of the doubled time.
/// @param failures at least 1
std::chrono::nanoseconds GetBackOff(int failures, const TokenSourceOptions &options, double random) noexcept;

} // namespace SsoClient
