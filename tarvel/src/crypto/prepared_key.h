// SPDX-License-Identifier: Apache-2.0
/// @file
/// `PreparedKey`, a public key with everything that checking a signature by it needs.

#pragma once

#include "crypto/key_contexts.h"
#include "crypto/openssl_handles.h"
#include "crypto/public_key.h"

#include <tarvel/core/ref.h>

namespace Tarvel::Crypto {

/// What certificates and verifying keys have in common. Immutable except for the contexts that it keeps; safe on any thread.
class PreparedKey final : public Object {
public:
  /// @param native null if OpenSSL does not know the key's algorithm. A lack of memory must be ruled out before.
  /// @throws CryptoException when the key's numbers cannot be read; OutOfMemoryException. Use under an `OpenSslGuard`.
  explicit PreparedKey(KeyHandle native);

  KeyKind GetKind() const noexcept { return m_kind; }
  /// Size of the RSA modulus or of the curve's order. For other kinds of keys it is what OpenSSL reports, or 0.
  unsigned GetBits() const noexcept { return m_bits; }
  /// "RSA", "EC" for a key on any curve, or empty.
  const char *GetAlgorithm() const noexcept { return m_algorithm; }
  /// Whether an RSA key's public exponent is odd and at least 3; true for other kinds of keys.
  bool HasAcceptableExponent() const noexcept { return m_hasAcceptableExponent; }
  KeyContexts &GetVerifyContexts() const noexcept { return m_verifyContexts; }

  /// Owned by this object. Null if OpenSSL does not know the key's algorithm.
  EVP_PKEY *GetNative() const noexcept { return m_native.get(); }

private:
  ~PreparedKey() override = default;

  KeyHandle m_native;
  const char *m_algorithm = "";
  KeyKind m_kind = KeyKind::OTHER;
  unsigned m_bits = 0;
  bool m_hasAcceptableExponent = true;
  mutable KeyContexts m_verifyContexts;
};

/// Whether an RSA key with this public exponent can be used: with the exponent 1, anyone can sign; for an even exponent,
/// there is no private key (RFC 8017, section 3.1).
bool IsExponentSound(const BIGNUM *exponent) noexcept;

} // namespace Tarvel::Crypto
