// SPDX-License-Identifier: Apache-2.0

#include "crypto/provider_turn.h"

#include "crypto/library_context.h"

#include <tarvel/core/fork_safe_mutex.h>

#include <openssl/provider.h>

#include <string_view>

namespace Tarvel::Crypto {

namespace {

constinit ForkSafeMutex turn;

} // namespace

bool IsInAddedProvider(const EVP_PKEY *key) noexcept {
  const OSSL_PROVIDER *const provider = UsesSystemConfiguration() ? EVP_PKEY_get0_provider(key) : nullptr;
  const std::string_view name = provider ? OSSL_PROVIDER_get0_name(provider) : "default";
  return name != "default" && name != "fips" && name != "base" && name != "legacy";
}

ProviderTurn::ProviderTurn(bool isNeeded) : m_isNeeded(isNeeded) {
  Resume();
}

ProviderTurn::~ProviderTurn() {
  Suspend();
}

void ProviderTurn::Suspend() noexcept {
  if (m_isUnderWay) {
    m_isUnderWay = false;
    turn.unlock();
  }
}

void ProviderTurn::Resume() {
  if (m_isNeeded) {
    turn.lock();
    m_isUnderWay = true;
  }
}

} // namespace Tarvel::Crypto
