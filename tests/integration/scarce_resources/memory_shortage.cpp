// SPDX-License-Identifier: Apache-2.0

#include "integration/scarce_resources/memory_shortage.h"

#include "support/refused_memory.h"

#include <array>
#include <atomic>
#include <cstring>
#include <new>

#include <sys/prctl.h>

namespace {

using Testing::Shortage;

std::atomic<Shortage> g_shortage{Shortage::NONE};
std::atomic<int> g_piecesLeft{0};
std::atomic<int> g_refused{0};
thread_local bool isInStart = false;

/// Whether the calling thread is one of the platform's threads, or is in a test's call that starts an operation.
bool IsConcerned() noexcept {
  thread_local const bool isOfPlatform = [] {
    std::array<char, 16> name{};
    ::prctl(PR_GET_NAME, name.data());
    return std::strncmp(name.data(), "tarvel-", 7) == 0;
  }();
  return isOfPlatform || isInStart;
}

} // namespace

bool Testing::IsMemoryRefused() noexcept {
  const Shortage shortage = g_shortage;
  if (shortage == Shortage::NONE || !IsConcerned()) {
    return false;
  }
  const int left = g_piecesLeft--;
  const bool isRefused = shortage == Shortage::OF_ONE_PIECE ? left == 0 : left <= 0;
  g_refused += isRefused;
  return isRefused;
}

// The linker calls this in place of the C library's function.
void *RealAlignedAllocate(std::size_t alignment, std::size_t size) asm("__real_aligned_alloc");
void *AlignedAllocate(std::size_t alignment, std::size_t size) asm("__wrap_aligned_alloc");
void *AlignedAllocate(std::size_t alignment, std::size_t size) {
  return Testing::IsMemoryRefused() ? nullptr : RealAlignedAllocate(alignment, size);
}

namespace Testing {

bool StartShortOfMemory(Shortage shortage, int pieces, const std::function<void()> &start) {
  g_piecesLeft = pieces;
  g_refused = 0;
  g_shortage = shortage;
  isInStart = true;
  bool hasThrown = false;
  try {
    start();
  } catch (const std::bad_alloc &) {
    hasThrown = true;
  }
  isInStart = false;
  return hasThrown;
}

EnoughMemory::EnoughMemory() noexcept {
  isInStart = false;
}

EnoughMemory::~EnoughMemory() {
  isInStart = true;
}

int EndShortage() {
  g_shortage = Shortage::NONE;
  return g_refused;
}

} // namespace Testing
