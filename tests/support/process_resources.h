// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the test process holds: open descriptors and threads.

#pragma once

#include "support/completion.h"
#include "support/sanitized.h"

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <iterator>
#include <thread>

namespace Testing {

inline std::size_t CountEntries(const char *directory) {
  const std::filesystem::directory_iterator entries(directory);
  return static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
}

inline std::size_t CountDescriptors() {
  return CountEntries("/proc/self/fd");
}

inline std::size_t CountThreads() {
  // ThreadSanitizer's own thread starts with the first one of the process: it must not count as ours.
  static const bool started = (std::thread([] {}).join(), true);
  static_cast<void>(started);
  return CountEntries("/proc/self/task");
}

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
