// SPDX-License-Identifier: Apache-2.0
/// @file
/// Verification contexts that are ready for use, kept with the certificate whose key they hold.

#pragma once

#include "crypto/kept_contexts.h"
#include "crypto/openssl_handles.h"
#include "crypto/public_key.h"

#include <cstddef>
#include <utility>

namespace Tarvel::Crypto {

/// The contexts of one key: to set one up costs a fifth of an RSA check. Lock-free; safe on any thread.
class VerifyContexts {
public:
  VerifyContexts() = default;
  VerifyContexts(const VerifyContexts &) = delete;
  VerifyContexts &operator=(const VerifyContexts &) = delete;
  ~VerifyContexts() { m_contexts.FreeAll(); }

  /// A context set up for `scheme` and `algorithm`; null when there is none at hand.
  KeyContextHandle Take(SignatureScheme scheme, DigestAlgorithm algorithm) noexcept {
    return m_contexts.Take(KindOf(scheme, algorithm));
  }

  /// Keeps `context` for the next taker, or frees it when enough are kept already.
  void Put(SignatureScheme scheme, DigestAlgorithm algorithm, KeyContextHandle context) noexcept {
    m_contexts.Put(KindOf(scheme, algorithm), std::move(context));
  }

private:
  static constexpr std::size_t SCHEMES = 3;
  static constexpr std::size_t ALGORITHMS = 3;

  static std::size_t KindOf(SignatureScheme scheme, DigestAlgorithm algorithm) noexcept {
    return static_cast<std::size_t>(scheme) * ALGORITHMS + static_cast<std::size_t>(algorithm);
  }

  KeptContexts<KeyContextHandle, SCHEMES * ALGORITHMS> m_contexts;
};

} // namespace Tarvel::Crypto
