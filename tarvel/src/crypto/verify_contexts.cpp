// SPDX-License-Identifier: Apache-2.0

#include "crypto/verify_contexts.h"

namespace Tarvel::Crypto {

VerifyContexts::~VerifyContexts() {
  for (Slots &slots : m_slots) {
    for (std::atomic<EVP_PKEY_CTX *> &slot : slots) {
      const KeyContextHandle freed(slot.load(std::memory_order_relaxed));
    }
  }
}

VerifyContexts::Slots &VerifyContexts::GetSlots(SignatureScheme scheme, DigestAlgorithm algorithm) noexcept {
  return m_slots[static_cast<std::size_t>(scheme) * ALGORITHMS + static_cast<std::size_t>(algorithm)];
}

KeyContextHandle VerifyContexts::Take(SignatureScheme scheme, DigestAlgorithm algorithm) noexcept {
  for (std::atomic<EVP_PKEY_CTX *> &slot : GetSlots(scheme, algorithm)) {
    if (!slot.load(std::memory_order_relaxed)) {
      continue;
    }
    if (EVP_PKEY_CTX *const context = slot.exchange(nullptr, std::memory_order_acquire)) {
      return KeyContextHandle(context);
    }
  }
  return nullptr;
}

void VerifyContexts::Put(SignatureScheme scheme, DigestAlgorithm algorithm, KeyContextHandle context) noexcept {
  for (std::atomic<EVP_PKEY_CTX *> &slot : GetSlots(scheme, algorithm)) {
    EVP_PKEY_CTX *expected = nullptr;
    if (slot.compare_exchange_strong(expected, context.get(), std::memory_order_release, std::memory_order_relaxed)) {
      static_cast<void>(context.release()); // the slot owns it now
      return;
    }
  }
}

} // namespace Tarvel::Crypto
