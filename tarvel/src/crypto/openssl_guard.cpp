// SPDX-License-Identifier: Apache-2.0

#include "crypto/openssl_guard.h"

#include "core/thread_shard.h"
#include "crypto/library_context.h"
#include "crypto/openssl_clean_up.h"
#include "crypto/openssl_errors.h"
#include "system/thread_pool.h"

#include <tarvel/core/exception.h>

#include <openssl/crypto.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <mutex>
#include <new>
#include <thread>
#include <utility>

namespace Tarvel::Crypto {

namespace {

/// A use only computes, which takes far less time than this.
constexpr std::chrono::milliseconds MAX_WAIT{500};
constexpr std::chrono::microseconds WAIT_STEP{100};

/// The uses under way, counted per shard: a single counter would be a point of contention.
struct alignas(SHARD_ALIGNMENT) Shard {
  std::atomic<std::uint32_t> uses{0};
};

// Constant-initialised and never destroyed. Both are sequentially consistent: either a use that begins sees `ended`, or the
// clean-up sees the use.
std::array<Shard, 16> shards;
std::atomic<bool> ended{false};

struct Abandoned {
  void *object;
  Abandoned *next;
};
std::atomic<Abandoned *> abandoned{nullptr};

/// Begins a use and returns the counter that counts it; null if the clean-up has begun.
std::atomic<std::uint32_t> *TryBegin() noexcept {
  std::atomic<std::uint32_t> &uses = shards[GetThreadShard(shards.size())].uses;
  uses.fetch_add(1);
  if (ended.load()) {
    uses.fetch_sub(1);
    return nullptr;
  }
  return &uses;
}

bool IsAnyUseUnderWay() noexcept {
  return std::any_of(shards.begin(), shards.end(), [](const Shard &shard) { return shard.uses.load() != 0; });
}

void OnCleanUp() noexcept {
  ended.store(true);
  for (auto waited = WAIT_STEP; IsAnyUseUnderWay() && waited < MAX_WAIT; waited += WAIT_STEP) {
    std::this_thread::sleep_for(WAIT_STEP);
  }
  OpenSslCleanUpNotice::CallAll();
}

/// For idle threads of the pool. OpenSSL keeps an object for each thread. A thread that ended after the clean-up would
/// leak it.
bool FreeObjectsOfThread() noexcept {
  const OpenSslGuard guard;
  if (!guard) {
    return false;
  }
  OPENSSL_thread_stop();
  return true;
}

} // namespace

OpenSslGuard::OpenSslGuard() noexcept : m_count(TryBegin()) {}

OpenSslGuard::~OpenSslGuard() {
  Suspend();
}

void OpenSslGuard::Suspend() noexcept {
  if (m_count) {
    std::exchange(m_count, nullptr)->fetch_sub(1);
  }
}

bool OpenSslGuard::Resume() noexcept {
  m_count = TryBegin();
  return m_count != nullptr;
}

void OpenSslGuard::Require() const {
  if (!m_count) {
    throw InvalidStateException(ENDED);
  }
}

void OpenSslGuard::Abandon(void *object) noexcept {
  if (auto *const entry = new (std::nothrow) Abandoned{object, abandoned.load()}) {
    while (!abandoned.compare_exchange_weak(entry->next, entry)) {
    }
  }
}

void OpenSslGuard::Prepare() {
  // The computation begins before `call_once`. Otherwise the thread inside `call_once` could wait for a fork, the fork
  // for the computation of a second thread, and that thread for `call_once`.
  const Computation computing;
  static std::once_flag registered;
  std::call_once(registered, [] {
    // OpenSSL is initialised first, because its initialisation registers its clean-up.
    InitialiseOpenSsl();
    const OpenSslErrorScope errors;
    if (OPENSSL_atexit(OnCleanUp) != 1) {
      errors.Throw("Cannot initialise OpenSSL");
    }
    System::SetThreadEndHook(FreeObjectsOfThread);
  });
}

} // namespace Tarvel::Crypto
