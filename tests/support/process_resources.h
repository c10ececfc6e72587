// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the test process holds: open descriptors, threads and memory.

#pragma once

#include "support/completion.h"

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <iterator>
#include <malloc.h>
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

/// Whether this is a build under AddressSanitizer or ThreadSanitizer, where everything takes many times as long.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool IS_SANITIZED = true;
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
constexpr bool IS_SANITIZED = true;
#else
constexpr bool IS_SANITIZED = false;
#endif
#else
constexpr bool IS_SANITIZED = false;
#endif

/// How much is allocated on the heap, in all threads. What the allocator keeps to hand it out again does not count, but
/// for a few pieces at hand in each living thread. A sanitizer's allocator tells nothing here: always 0 then, and
/// AddressSanitizer's own check for leaks at the program's end stands in.
inline std::size_t CountAllocatedBytes() {
  if (IS_SANITIZED) {
    return 0;
  }
  const struct mallinfo2 heap = ::mallinfo2();
  return heap.uordblks + heap.hblkhd;
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
