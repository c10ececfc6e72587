// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the test process holds: open descriptors and threads.

#pragma once

#include "support/completion.h"

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

// Whether this is a build under AddressSanitizer or ThreadSanitizer; g++ and clang say so in different words.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define TESTING_IS_SANITIZED 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define TESTING_IS_SANITIZED 1
#endif
#endif

/// Under a sanitizer everything takes many times as long.
#ifdef TESTING_IS_SANITIZED
constexpr bool IS_SANITIZED = true;
#else
constexpr bool IS_SANITIZED = false;
#endif

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
