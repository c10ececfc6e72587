// SPDX-License-Identifier: Apache-2.0

#include "support/process_resources.h"

#include <filesystem>
#include <iterator>

namespace Testing {

namespace {

std::size_t CountEntries(const char *directory) {
  const std::filesystem::directory_iterator entries(directory);
  return static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
}

} // namespace

std::size_t CountDescriptors() {
  return CountEntries("/proc/self/fd");
}

std::size_t CountThreads() {
  // ThreadSanitizer's own thread starts with the first thread of the process, and must not be counted.
  static const bool started = (std::thread([] {}).join(), true);
  static_cast<void>(started);
  return CountEntries("/proc/self/task");
}

} // namespace Testing
