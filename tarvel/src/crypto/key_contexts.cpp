// SPDX-License-Identifier: Apache-2.0

#include "crypto/key_contexts.h"

namespace Tarvel::Crypto {

KeyContexts::~KeyContexts() {
  for (Lane &lane : m_lanes) {
    for (std::atomic<EVP_PKEY_CTX *> &slot : lane.contexts) {
      const KeyContextHandle freed(slot.load(std::memory_order_relaxed));
    }
  }
}

std::atomic<EVP_PKEY_CTX *> &KeyContexts::GetSlot(std::size_t lane, SignatureScheme scheme,
                                                  DigestAlgorithm algorithm) noexcept {
  const std::size_t kind = static_cast<std::size_t>(scheme) * ALGORITHMS + static_cast<std::size_t>(algorithm);
  return m_lanes[(System::GetThreadLane(LANES) + lane) % LANES].contexts[kind];
}

KeyContextHandle KeyContexts::Take(SignatureScheme scheme, DigestAlgorithm algorithm) noexcept {
  for (std::size_t lane = 0; lane < LANES; ++lane) {
    std::atomic<EVP_PKEY_CTX *> &slot = GetSlot(lane, scheme, algorithm);
    if (!slot.load(std::memory_order_relaxed)) {
      continue;
    }
    if (EVP_PKEY_CTX *const context = slot.exchange(nullptr, std::memory_order_acquire)) {
      return KeyContextHandle(context);
    }
  }
  return nullptr;
}

void KeyContexts::Put(SignatureScheme scheme, DigestAlgorithm algorithm, KeyContextHandle context) noexcept {
  for (std::size_t lane = 0; lane < LANES; ++lane) {
    EVP_PKEY_CTX *expected = nullptr;
    if (GetSlot(lane, scheme, algorithm)
            .compare_exchange_strong(expected, context.get(), std::memory_order_release, std::memory_order_relaxed)) {
      static_cast<void>(context.release()); // the slot owns it now
      return;
    }
  }
}

} // namespace Tarvel::Crypto
