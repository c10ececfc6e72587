// SPDX-License-Identifier: Apache-2.0
/// @file
/// Searches memory when it is freed. A program that is linked with freed_memory.cpp uses its C++ allocation functions.

#pragma once

namespace Testing {

/// Counts how many pieces of memory with `secret` in them are freed while it exists. Only one may exist at a time.
class FreedMemoryWatch {
public:
  /// @param secret null-terminated; must outlive this object
  explicit FreedMemoryWatch(const char *secret);
  FreedMemoryWatch(const FreedMemoryWatch &) = delete;
  FreedMemoryWatch &operator=(const FreedMemoryWatch &) = delete;
  ~FreedMemoryWatch();

  int Found() const;
};

/// From now on, `IsFollowedMemoryFreed` reports whether `memory` has been freed.
void FollowMemory(const void *memory) noexcept;
bool IsFollowedMemoryFreed() noexcept;

} // namespace Testing
