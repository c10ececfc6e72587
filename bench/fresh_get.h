// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares `TokenSource::Get`, while the token is fresh, with two variables that a program could use instead.

#pragma once

#include <memory>

namespace SsoClient {
class TokenSource;
}

namespace Bench {

/// Nanoseconds of wall time: from the start of the first thread to the end of the last one, divided by the calls of one
/// thread.
struct GetTimes {
  double source = 0;          ///< `TokenSource::Get`
  double atomicSharedPtr = 0; ///< a copy of a `std::atomic<std::shared_ptr>`
  double mutexSharedPtr = 0;  ///< a copy of a `std::shared_ptr` under a mutex
  double ratio = 0;           ///< of `source` to `atomicSharedPtr`; median of the rounds
};

/// Measures the three alternately in `rounds` rounds, and returns the medians.
/// @param source has a fresh token
GetTimes MeasureGet(const SsoClient::TokenSource &source, int threads, int rounds, int calls);

} // namespace Bench
