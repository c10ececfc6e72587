// SPDX-License-Identifier: Apache-2.0
/// @file
/// Counts the heap memory that the process has allocated, to the byte. This header replaces the C library's allocation
/// functions with ones that count, also for all libraries of the program: exactly one source file of a program includes
/// it.

#pragma once

#include "support/sanitized.h"

#include <malloc.h>

#include <atomic>
#include <cerrno>
#include <cstddef>
#include <cstdlib>

namespace Testing {

/// The bytes that malloc and similar functions have allocated on all threads and that are not freed. A sanitizer has
/// its own allocator, which is not replaced: then this is always 0, and AddressSanitizer checks for leaks at the
/// program's end.
inline std::atomic<std::size_t> &AllocatedBytes() {
  static std::atomic<std::size_t> bytes{0};
  return bytes;
}

inline std::size_t CountAllocatedBytes() {
  return AllocatedBytes();
}

} // namespace Testing

#ifndef TESTING_IS_SANITIZED
#pragma GCC visibility push(default) // for the shared libraries
// Other names of the C library's own functions. The replacements call them by these names.
extern "C" {
void *__libc_malloc(std::size_t size);
void *__libc_calloc(std::size_t count, std::size_t size);
void *__libc_realloc(void *memory, std::size_t size);
void *__libc_memalign(std::size_t alignment, std::size_t size);
void __libc_free(void *memory);

static void *CountAllocated(void *memory) {
  Testing::AllocatedBytes() += ::malloc_usable_size(memory);
  return memory;
}

void *malloc(std::size_t size) noexcept {
  return CountAllocated(__libc_malloc(size));
}
void *calloc(std::size_t count, std::size_t size) noexcept {
  return CountAllocated(__libc_calloc(count, size));
}
void *memalign(std::size_t alignment, std::size_t size) noexcept {
  return CountAllocated(__libc_memalign(alignment, size));
}
void *aligned_alloc(std::size_t alignment, std::size_t size) noexcept {
  return CountAllocated(__libc_memalign(alignment, size));
}
int posix_memalign(void **memory, std::size_t alignment, std::size_t size) noexcept {
  *memory = CountAllocated(__libc_memalign(alignment, size));
  return *memory ? 0 : ENOMEM;
}
void *realloc(void *memory, std::size_t size) noexcept {
  const std::size_t before = ::malloc_usable_size(memory);
  void *const after = __libc_realloc(memory, size);
  if (after || size == 0) {
    Testing::AllocatedBytes() -= before;
  }
  return CountAllocated(after);
}
void free(void *memory) noexcept {
  Testing::AllocatedBytes() -= ::malloc_usable_size(memory);
  __libc_free(memory);
}
}
#pragma GCC visibility pop
#endif
