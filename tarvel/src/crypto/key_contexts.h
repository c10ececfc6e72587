// SPDX-License-Identifier: Apache-2.0
/// @file
/// `KeyContexts`, the contexts that a certificate or a private key keeps for checking or making signatures.

#pragma once

#include "crypto/kept_contexts.h"
#include "crypto/openssl_handles.h"
#include "crypto/public_key.h"

#include <cstddef>
#include <utility>

namespace Tarvel::Crypto {

/// Contexts for one key and one operation: either checking signatures or making them. Setting up a context costs a
/// fifth of an RSA check, so contexts are kept for reuse. Lock-free; safe on any thread.
class KeyContexts {
public:
  KeyContexts() = default;
  KeyContexts(const KeyContexts &) = delete;
  KeyContexts &operator=(const KeyContexts &) = delete;
  ~KeyContexts() { Clear(); }

  /// Frees all kept contexts. Only while no other thread uses the object.
  void Clear() noexcept { m_contexts.FreeAll(); }

  /// A context set up for `scheme` and `algorithm`; null if none is kept.
  KeyContextHandle Acquire(SignatureScheme scheme, DigestAlgorithm algorithm) noexcept {
    return m_contexts.Acquire(KindOf(scheme, algorithm));
  }

  /// Keeps `context` for reuse, or frees it if enough are kept already.
  void Return(SignatureScheme scheme, DigestAlgorithm algorithm, KeyContextHandle context) noexcept {
    m_contexts.Return(KindOf(scheme, algorithm), std::move(context));
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
