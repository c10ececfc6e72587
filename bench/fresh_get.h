// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares `TokenSource::Get` with a fresh token with what a program could write instead.

#pragma once

#include <memory>

namespace SsoClient {
class TokenSource;
}

namespace Bench {

/// Nanoseconds of wall time for one call on each of the threads: the time from start to end, divided by the calls of one
/// thread.
struct GetTimes {
  double source = 0;          ///< `TokenSource::Get`
  double atomicSharedPtr = 0; ///< a copy of a `std::atomic<std::shared_ptr>`
  double mutexSharedPtr = 0;  ///< a copy of a `std::shared_ptr` under a mutex
  double ratio = 0;           ///< median of the rounds' ratios of the first to the second
};

/// Measures the three alternately, some rounds, and returns the medians.
/// @param source has a fresh token
GetTimes MeasureGet(const SsoClient::TokenSource &source, int threads, int rounds, int calls);

} // namespace Bench
