// SPDX-License-Identifier: Apache-2.0

#include "crypto/openssl_use.h"

#include "crypto/openssl_errors.h"

#include <tarvel/crypto/certificate.h>

#include <openssl/crypto.h>
#include <openssl/ssl.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <mutex>
#include <new>
#include <thread>

namespace Tarvel::Crypto {

namespace {

constexpr std::uint32_t ENDED = 1u << 31;

/// A use is computation alone, so this is far more than one takes. A child process that was forked during a use of its
/// parent's waits for all of it, for nobody there will end that use.
constexpr std::chrono::milliseconds MAX_WAIT{500};
constexpr std::chrono::microseconds WAIT_STEP{100};

/// How many uses are going on, and whether there may be more. Constant-initialised and never destroyed.
std::atomic<std::uint32_t> uses{0};

struct Abandoned {
  void *object;
  Abandoned *next;
};
std::atomic<Abandoned *> abandoned{nullptr};

bool TryBegin() noexcept {
  std::uint32_t current = uses.load(std::memory_order_relaxed);
  while ((current & ENDED) == 0) {
    if (uses.compare_exchange_weak(current, current + 1, std::memory_order_acquire, std::memory_order_relaxed)) {
      return true;
    }
  }
  return false;
}

void OnCleanUp() noexcept {
  uses.fetch_or(ENDED, std::memory_order_acq_rel);
  for (auto waited = WAIT_STEP; uses.load(std::memory_order_acquire) != ENDED && waited < MAX_WAIT;
       waited += WAIT_STEP) {
    std::this_thread::sleep_for(WAIT_STEP);
  }
}

} // namespace

OpenSslUse::OpenSslUse() noexcept : m_isAllowed(TryBegin()) {}

OpenSslUse::~OpenSslUse() {
  if (m_isAllowed) {
    uses.fetch_sub(1, std::memory_order_release);
  }
}

void OpenSslUse::Require() const {
  if (!m_isAllowed) {
    throw CryptoException("OpenSSL has cleaned itself up: the process is about to end");
  }
}

void OpenSslUse::Abandon(void *object) noexcept {
  if (auto *const entry = new (std::nothrow) Abandoned{object, abandoned.load()}) {
    while (!abandoned.compare_exchange_weak(entry->next, entry)) {
    }
  }
}

void OpenSslUse::Prepare() {
  static std::once_flag registered;
  std::call_once(registered, [] {
    const OpenSslErrorScope errors;
    // In this order, for it is OpenSSL's own initialisation that arranges for the clean-up.
    if (OPENSSL_init_ssl(0, nullptr) != 1 || OPENSSL_atexit(OnCleanUp) != 1) {
      errors.Throw("Cannot initialise OpenSSL");
    }
  });
}

} // namespace Tarvel::Crypto
