// SPDX-License-Identifier: Apache-2.0
/// @file
/// `LargePageAllocator`, for large arrays that are read at random places.

#pragma once

#include <tarvel/core/large_pages.h>

#include <cstddef>
#include <limits>
#include <new>

namespace SsoClient {

/// Asks the kernel for large pages, where a whole one has a place in the array. Otherwise, nearly each read of a random place also
/// waits for the processor to find the page, which takes as long as the read itself. Without large pages, the array works the
/// same.
template <typename T>
class LargePageAllocator {
public:
  using value_type = T;

  LargePageAllocator() = default;
  template <typename U>
  LargePageAllocator(const LargePageAllocator<U> &) noexcept {}

  /// @throws std::bad_alloc
  T *allocate(std::size_t count) {
    if (count > std::numeric_limits<std::size_t>::max() / sizeof(T)) {
      throw std::bad_array_new_length();
    }
    void *const memory = ::operator new(count * sizeof(T));
    Tarvel::AskForLargePages(memory, count * sizeof(T));
    return static_cast<T *>(memory);
  }

  void deallocate(T *memory, std::size_t) noexcept { ::operator delete(memory); }

  template <typename U>
  bool operator==(const LargePageAllocator<U> &) const noexcept {
    return true;
  }
};

} // namespace SsoClient
