// SPDX-License-Identifier: Apache-2.0

#include "integration/secret_wiping/freed_memory.h"

#include <malloc.h>

#include <atomic>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <new>

namespace {

std::atomic<const char *> g_secret{nullptr}; // not owned; null when there is no search
std::atomic<int> g_found{0};

std::atomic<const void *> g_followed{nullptr}; // not owned; only compared, because it may be freed
std::atomic<bool> g_isFollowedFreed{false};

void LookForSecret(const void *memory) noexcept {
  const char *const secret = g_secret.load();
  if (!secret || !memory) {
    return;
  }
  const std::size_t bytes = malloc_usable_size(const_cast<void *>(memory));
  if (memmem(memory, bytes, secret, std::strlen(secret))) {
    ++g_found;
  }
}

void *Allocate(std::size_t bytes) {
  // Overwrites the previous content, so that only what the code under test wrote is found.
  void *const memory = std::calloc(1, bytes ? bytes : 1);
  if (!memory) {
    throw std::bad_alloc();
  }
  return memory;
}

void Free(void *memory) noexcept {
  LookForSecret(memory);
  if (memory && memory == g_followed.load()) {
    g_isFollowedFreed = true;
  }
  std::free(memory);
}

} // namespace

void *operator new(std::size_t bytes) {
  return Allocate(bytes);
}
void *operator new[](std::size_t bytes) {
  return Allocate(bytes);
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

namespace Testing {

FreedMemoryWatch::FreedMemoryWatch(const char *secret) {
  g_found = 0;
  g_secret = secret;
}

FreedMemoryWatch::~FreedMemoryWatch() {
  g_secret = nullptr;
}

int FreedMemoryWatch::Found() const {
  return g_found;
}

void FollowMemory(const void *memory) noexcept {
  g_isFollowedFreed = false;
  g_followed = memory;
}

bool IsFollowedMemoryFreed() noexcept {
  return g_isFollowedFreed;
}

} // namespace Testing
