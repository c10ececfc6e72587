// SPDX-License-Identifier: Apache-2.0
/// @file
/// How often a test repeats when repetition is its point.

#pragma once

#include <cstdlib>

namespace Testing {

/// `full` when the environment has SSOCLIENT_TESTS_IN_FULL, as in `scripts/check in_full`, otherwise `reduced`. A test
/// that calls this must be listed in tests/long_tests.cmake.
template <typename Count>
Count Repetitions(Count full, Count reduced) {
  return std::getenv("SSOCLIENT_TESTS_IN_FULL") ? full : reduced;
}

} // namespace Testing
