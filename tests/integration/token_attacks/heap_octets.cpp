// SPDX-License-Identifier: Apache-2.0

#include "heap_octets.h"

#include <algorithm>
#include <cstdlib>
#include <malloc.h>
#include <new>

namespace {

std::size_t g_allocated = 0;
std::size_t g_live = 0; // including what the C library adds to each piece
std::size_t g_peak = 0;

void *Allocate(std::size_t size) {
  void *const memory = std::malloc(size ? size : 1);
  if (!memory) {
    throw std::bad_alloc();
  }
  g_allocated += size;
  g_live += ::malloc_usable_size(memory);
  g_peak = std::max(g_peak, g_live);
  return memory;
}

void Free(void *memory) noexcept {
  g_live -= ::malloc_usable_size(memory);
  std::free(memory);
}

} // namespace

void *operator new(std::size_t size) {
  return Allocate(size);
}
void *operator new[](std::size_t size) {
  return Allocate(size);
}
void operator delete(void *memory) noexcept {
  Free(memory);
}
void operator delete[](void *memory) noexcept {
  Free(memory);
}
void operator delete(void *memory, std::size_t) noexcept {
  Free(memory);
}
void operator delete[](void *memory, std::size_t) noexcept {
  Free(memory);
}

namespace Attacks {

HeapCount::HeapCount() noexcept : m_allocatedBefore(g_allocated), m_liveBefore(g_live) {
  g_peak = g_live;
}

std::size_t HeapCount::GetAllocated() const noexcept {
  return g_allocated - m_allocatedBefore;
}

std::size_t HeapCount::GetPeak() const noexcept {
  return g_peak - m_liveBefore;
}

} // namespace Attacks
