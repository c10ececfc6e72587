// SPDX-License-Identifier: Apache-2.0

#include "integration/out_of_memory/failing_memory.h"

#include "crypto/recent_certificates.h"

#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <limits>

#include <openssl/crypto.h>

namespace Testing {

namespace {

constexpr long NEVER = std::numeric_limits<long>::max();

// Only FailingMemory begins and ends a shortage: an allocation on a late thread cannot begin another one.
std::atomic<long> g_left{NEVER}; // allocations up to the one that fails; 0 or less after it
std::atomic<bool> g_keepsFailing{false};
std::atomic<long> g_live{0};

/// Whether this allocation fails; sets errno as `malloc` does.
bool Fails() noexcept {
  const long left = g_left.fetch_sub(1);
  if (left > 1 || (left < 1 && !g_keepsFailing)) {
    return false;
  }
  errno = ENOMEM;
  return true;
}

void *Allocate(std::size_t bytes) noexcept {
  void *const memory = bytes == 0 || Fails() ? nullptr : std::malloc(bytes);
  g_live += memory != nullptr;
  return memory;
}

void *Reallocate(void *memory, std::size_t bytes) noexcept {
  if (!memory) {
    return Allocate(bytes);
  }
  return Fails() ? nullptr : std::realloc(memory, bytes);
}

void Free(void *memory) noexcept {
  g_live -= memory != nullptr;
  std::free(memory);
}

void *AllocateForOpenSsl(std::size_t bytes, const char *, int) {
  return Allocate(bytes);
}
void *ReallocateForOpenSsl(void *memory, std::size_t bytes, const char *, int) {
  if (memory && bytes == 0) {
    Free(memory);
    return nullptr;
  }
  return Reallocate(memory, bytes);
}
void FreeForOpenSsl(void *memory, const char *, int) {
  Free(memory);
}

const bool IS_INSTALLED = CRYPTO_set_mem_functions(AllocateForOpenSsl, ReallocateForOpenSsl, FreeForOpenSsl) == 1;

} // namespace

FailingMemory::FailingMemory(int number, Shortage shortage) {
  if (!IS_INSTALLED) {
    std::abort();
  }
  Tarvel::Crypto::ForgetRecentCertificates(); // so that decoding certificates can fail, too
  g_keepsFailing = shortage == Shortage::FROM_THEN;
  g_left = number;
}

FailingMemory::~FailingMemory() {
  g_keepsFailing = false;
  g_left = NEVER;
}

bool FailingMemory::HasFailed() const noexcept {
  return g_left <= 0;
}

long CountForeignAllocations() {
  return g_live;
}

} // namespace Testing
