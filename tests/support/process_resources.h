// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the test process holds: open descriptors and threads.

#pragma once

#include "support/completion.h"

#include <chrono>
#include <cstddef>
#include <thread>

namespace Testing {

std::size_t CountDescriptors();

std::size_t CountThreads();

/// Whether `condition` comes true in bounded time. For what ends in the kernel, which notifies nobody.
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
