// SPDX-License-Identifier: Apache-2.0
/// @file
/// Verification contexts that are ready for use, kept with the certificate whose key they hold.

#pragma once

#include "crypto/openssl_handles.h"
#include "crypto/public_key.h"

#include <array>
#include <atomic>
#include <cstddef>

namespace Tarvel::Crypto {

/// Setting a verification context up costs a fifth of an RSA check, and a context is for one thread at a time: so a
/// thread takes one out, uses it and puts it back. Lock-free; safe on any thread.
class VerifyContexts {
public:
  VerifyContexts() = default;
  VerifyContexts(const VerifyContexts &) = delete;
  VerifyContexts &operator=(const VerifyContexts &) = delete;
  ~VerifyContexts();

  /// A context set up for `scheme` and `algorithm`; null when there is none at hand.
  KeyContextHandle Take(SignatureScheme scheme, DigestAlgorithm algorithm) noexcept;

  /// Keeps `context` for the next taker, or frees it when enough are kept already.
  void Put(SignatureScheme scheme, DigestAlgorithm algorithm, KeyContextHandle context) noexcept;

private:
  static constexpr std::size_t SCHEMES = 3;
  static constexpr std::size_t ALGORITHMS = 3;
  static constexpr std::size_t KEPT_CONTEXTS =
      4; // threads beyond these that use one certificate at once set up their own

  using Slots = std::array<std::atomic<EVP_PKEY_CTX *>, KEPT_CONTEXTS>;

  Slots &GetSlots(SignatureScheme scheme, DigestAlgorithm algorithm) noexcept;

  std::array<Slots, SCHEMES * ALGORITHMS> m_slots{};
};

} // namespace Tarvel::Crypto
