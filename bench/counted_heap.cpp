// SPDX-License-Identifier: Apache-2.0
// Replaces the allocation operators of C++ in the program; memory that C libraries get from malloc is not counted.

#include "counted_heap.h"

#include <malloc.h>

#include <algorithm>
#include <cstdlib>
#include <new>

namespace Bench {

namespace {

// Not atomic: the programs that count have one thread.
std::size_t held = 0;
std::size_t most = 0;

void *Take(std::size_t octets) {
  void *const memory = std::malloc(octets == 0 ? 1 : octets);
  if (!memory) {
    throw std::bad_alloc();
  }
  held += ::malloc_usable_size(memory);
  most = std::max(most, held);
  return memory;
}

void Give(void *memory) noexcept {
  held -= memory ? ::malloc_usable_size(memory) : 0;
  std::free(memory);
}

} // namespace

std::size_t StartCountingHeap() {
  most = held;
  return held;
}

std::size_t GetMostHeap() {
  return most;
}

} // namespace Bench

void *operator new(std::size_t octets) {
  return Bench::Take(octets);
}
void *operator new[](std::size_t octets) {
  return Bench::Take(octets);
}
void operator delete(void *memory) noexcept {
  Bench::Give(memory);
}
void operator delete[](void *memory) noexcept {
  Bench::Give(memory);
}
void operator delete(void *memory, std::size_t) noexcept {
  Bench::Give(memory);
}
void operator delete[](void *memory, std::size_t) noexcept {
  Bench::Give(memory);
}
