// SPDX-License-Identifier: Apache-2.0
/// @file
/// Counts the open descriptors and the threads of the test process.

#pragma once

#include "support/completion.h"

#include <chrono>
#include <cstddef>
#include <thread>

namespace Testing {

std::size_t CountDescriptors();

std::size_t CountThreads();

/// Whether `condition` becomes true in bounded time. For events in the kernel, which sends no notification of them.
template <typename Condition>
bool Eventually(const Condition &condition) {
  const auto end = std::chrono::steady_clock::now() + PATIENCE;
  while (!condition()) {
    if (std::chrono::steady_clock::now() > end) {
      return false;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  return true;
}

} // namespace Testing
