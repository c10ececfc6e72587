// SPDX-License-Identifier: Apache-2.0
/// @file
/// `LargePageAllocator`, for large arrays that are read at random places.

#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <new>

#include <sys/mman.h>

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
    AskForLargePages(reinterpret_cast<std::uintptr_t>(memory), count * sizeof(T));
    return static_cast<T *>(memory);
  }

  void deallocate(T *memory, std::size_t) noexcept { ::operator delete(memory); }

  template <typename U>
  bool operator==(const LargePageAllocator<U> &) const noexcept {
    return true;
  }

private:
  // A failure is ignored: without large pages, the array works the same.
  static void AskForLargePages(std::uintptr_t memory, std::size_t bytes) noexcept {
    constexpr std::uintptr_t LARGE_PAGE_BYTES = std::uintptr_t{2} << 20;
    const std::uintptr_t offset = (LARGE_PAGE_BYTES - memory % LARGE_PAGE_BYTES) % LARGE_PAGE_BYTES;
    if (bytes >= offset + LARGE_PAGE_BYTES) {
      const std::uintptr_t whole = (bytes - offset) / LARGE_PAGE_BYTES * LARGE_PAGE_BYTES;
      madvise(reinterpret_cast<void *>(memory + offset), whole, MADV_HUGEPAGE);
    }
  }
};

} // namespace SsoClient
