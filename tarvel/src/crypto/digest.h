// SPDX-License-Identifier: Apache-2.0
/// @file
/// Message digests, computed piece by piece.

#pragma once

#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"

#include <tarvel/crypto/message_digest.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

namespace Tarvel::Crypto {

using DigestAlgorithm = HashAlgorithm;

constexpr std::size_t MAX_DIGEST_BYTES = 64;

constexpr std::size_t DigestBytes(DigestAlgorithm algorithm) noexcept {
  return algorithm == DigestAlgorithm::SHA256 ? 32 : algorithm == DigestAlgorithm::SHA384 ? 48 : 64;
}

/// A digest that is being computed. For one thread, and only as a local variable: if the thread begins another use of
/// OpenSSL while the digest exists, that use must end before the digest is destroyed.
class Digest {
public:
  /// @throws CryptoException when the cryptographic library does not offer the algorithm; InvalidStateException when it has
  ///         cleaned itself up; OutOfMemoryException.
  explicit Digest(DigestAlgorithm algorithm);
  Digest(const Digest &) = delete;
  Digest &operator=(const Digest &) = delete;
  ~Digest();

  /// Adds `bytes` to the message.
  /// @throws CryptoException, OutOfMemoryException. `Finish` throws the same.
  void Update(std::string_view bytes);

  /// Writes `DigestBytes(algorithm)` bytes to `out`; the digest must not be used afterwards.
  void Finish(std::uint8_t *out);

private:
  const OpenSslGuard m_guard;
  std::optional<OpenSslErrorScope> m_errors; // set by the constructor after it has checked that OpenSSL may be called
  const DigestAlgorithm m_algorithm;
  void *m_context; // EVP_MD_CTX; null after `Finish` has kept it for another digest
};

} // namespace Tarvel::Crypto
