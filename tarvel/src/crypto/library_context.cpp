// SPDX-License-Identifier: Apache-2.0

#include "crypto/library_context.h"

#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/system_configuration.h>

#include <openssl/crypto.h>
#include <openssl/provider.h>
#include <openssl/ssl.h>

#include <atomic>
#include <cstdint>

namespace Tarvel::Crypto {

namespace {

enum class Configuration { UNDECIDED, NONE, OF_SYSTEM };

std::atomic<Configuration> configuration{Configuration::UNDECIDED};

// Never freed: threads that run until the process ends use it.
std::atomic<OSSL_LIB_CTX *> libraryContext{nullptr};

/// Decides for `wanted` if no decision was made before. Returns the decision that was made first.
Configuration Decide(Configuration wanted) noexcept {
  Configuration decided = Configuration::UNDECIDED;
  return configuration.compare_exchange_strong(decided, wanted) ? wanted : decided;
}

/// Throws if the default provider cannot be loaded. It must not return null: OpenSSL would then use its default
/// context with that context's providers.
OSSL_LIB_CTX *CreateLibraryContext(const OpenSslErrorScope &errors) {
  OSSL_LIB_CTX *const context = OSSL_LIB_CTX_new();
  if (!context || !OSSL_PROVIDER_load(context, "default")) {
    OSSL_LIB_CTX_free(context);
    errors.Throw("Cannot load OpenSSL's default provider");
  }
  return context;
}

} // namespace

OSSL_LIB_CTX *GetLibraryContext() noexcept {
  return libraryContext.load(std::memory_order_acquire);
}

bool UsesSystemConfiguration() noexcept {
  return configuration.load() == Configuration::OF_SYSTEM;
}

void InitialiseOpenSsl() {
  const OpenSslErrorScope errors;
  const bool isOfSystem = Decide(Configuration::NONE) == Configuration::OF_SYSTEM;
  const std::uint64_t configurationFlag = isOfSystem ? OPENSSL_INIT_LOAD_CONFIG : OPENSSL_INIT_NO_LOAD_CONFIG;
  // OpenSSL reads its configuration when the first context for TLS is created, unless a flag forbids it. Only the first
  // such flag in a process has an effect.
  const bool isUsable = OPENSSL_init_crypto(0, nullptr) == 1; // false after its clean-up, or without memory
  if (!isUsable || OPENSSL_init_ssl(configurationFlag, nullptr) != 1) {
    static std::atomic<bool> lackedMemory{false}; // OpenSSL does not retry what has failed once
    lackedMemory = lackedMemory || errors.RanOutOfMemory();
    if (lackedMemory) {
      throw OutOfMemoryException();
    }
    if (!isUsable) {
      throw InvalidStateException(OpenSslGuard::ENDED);
    }
    errors.Throw("Cannot initialise OpenSSL");
  }
  if (!isOfSystem && !GetLibraryContext()) {
    libraryContext.store(CreateLibraryContext(errors), std::memory_order_release);
  }
}

LibraryContextScope::LibraryContextScope() noexcept : m_hostContext(OSSL_LIB_CTX_set0_default(GetLibraryContext())) {}

LibraryContextScope::~LibraryContextScope() {
  OSSL_LIB_CTX_set0_default(m_hostContext);
}

void UseSystemConfiguration() {
  if (Decide(Configuration::OF_SYSTEM) != Configuration::OF_SYSTEM) {
    throw InvalidStateException(
        "The system's configuration of OpenSSL is asked for too late: OpenSSL is in use already");
  }
  OpenSslGuard::Prepare();
  const OpenSslGuard guard;
  guard.Require();
}

} // namespace Tarvel::Crypto
