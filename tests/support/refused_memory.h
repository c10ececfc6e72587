// SPDX-License-Identifier: Apache-2.0
/// @file
/// Lets a test refuse memory to C++ code. This header replaces the allocation functions of C++: exactly one source file
/// of a program includes it, and defines `IsMemoryRefused`.

#pragma once

#include <cstddef>
#include <cstdlib>
#include <new>

namespace Testing {

/// Whether an allocation must fail; called for each one, on its thread. Must not allocate.
bool IsMemoryRefused() noexcept;

/// How many pieces of memory the calling thread has allocated, minus how many it has freed.
inline thread_local long t_liveAllocations = 0;

inline void *AllocateUnlessRefused(std::size_t bytes) {
  void *const memory = IsMemoryRefused() ? nullptr : std::malloc(bytes ? bytes : 1);
  if (!memory) {
    throw std::bad_alloc();
  }
  ++t_liveAllocations;
  return memory;
}

inline void Free(void *memory) noexcept {
  t_liveAllocations -= memory ? 1 : 0;
  std::free(memory);
}

} // namespace Testing

void *operator new(std::size_t bytes) {
  return Testing::AllocateUnlessRefused(bytes);
}
void *operator new[](std::size_t bytes) {
  return Testing::AllocateUnlessRefused(bytes);
}
void operator delete(void *memory) noexcept {
  Testing::Free(memory);
}
void operator delete[](void *memory) noexcept {
  Testing::Free(memory);
}
void operator delete(void *memory, std::size_t) noexcept {
  Testing::Free(memory);
}
void operator delete[](void *memory, std::size_t) noexcept {
  Testing::Free(memory);
}
