// SPDX-License-Identifier: Apache-2.0
/// @file
/// Counts allocations and reads of the clock, and lets allocations fail.

#pragma once

#include "support/sanitized.h"

namespace Testing {

#ifdef TESTING_IS_SANITIZED
constexpr bool CAN_COUNT_CLOCK_READS = false; // a sanitizer has its own function for the clock
#else
constexpr bool CAN_COUNT_CLOCK_READS = true;
#endif

/// What this thread has done so far.
struct CountedWork {
  long allocations = 0; ///< by C++ code
  long clockReads = 0;  ///< always 0 if they cannot be counted
};

CountedWork CountWork() noexcept;

/// While it exists, the n-th allocation of this thread fails, and all later ones, too, unless `failsOnce`.
class FailingAllocations {
public:
  FailingAllocations(long n, bool failsOnce) noexcept;
  FailingAllocations(const FailingAllocations &) = delete;
  FailingAllocations &operator=(const FailingAllocations &) = delete;
  ~FailingAllocations();
};

} // namespace Testing
