// SPDX-License-Identifier: Apache-2.0
/// @file
/// Contexts that are set up to check or to make signatures, kept with the certificate or the private key that they use.

#pragma once

#include "crypto/openssl_handles.h"
#include "crypto/public_key.h"
#include "system/thread_lane.h"

#include <array>
#include <atomic>
#include <cstddef>

namespace Tarvel::Crypto {

/// Contexts of one operation, checking or making signatures, and of one key. To set one up costs a fifth of an RSA check,
/// and a context is for one thread at a time: so a thread takes one out, uses it and puts it back, the one of its own lane
/// if it is there. Lock-free; safe on any thread.
class KeyContexts {
public:
  KeyContexts() = default;
  KeyContexts(const KeyContexts &) = delete;
  KeyContexts &operator=(const KeyContexts &) = delete;
  ~KeyContexts();

  /// A context set up for `scheme` and `algorithm`; null when there is none at hand.
  KeyContextHandle Take(SignatureScheme scheme, DigestAlgorithm algorithm) noexcept;

  /// Keeps `context` for the next taker, or frees it when enough are kept already.
  void Put(SignatureScheme scheme, DigestAlgorithm algorithm, KeyContextHandle context) noexcept;

private:
  static constexpr std::size_t SCHEMES = 3;
  static constexpr std::size_t ALGORITHMS = 3;
  static constexpr std::size_t LANES = 4; // threads beyond these that use one key at once set up their own

  struct alignas(System::LANE_ALIGNMENT) Lane {
    std::array<std::atomic<EVP_PKEY_CTX *>, SCHEMES * ALGORITHMS> contexts{};
  };

  /// Of the lanes, counted from the calling thread's own.
  std::atomic<EVP_PKEY_CTX *> &GetSlot(std::size_t lane, SignatureScheme scheme, DigestAlgorithm algorithm) noexcept;

  std::array<Lane, LANES> m_lanes;
};

} // namespace Tarvel::Crypto
