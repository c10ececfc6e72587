// SPDX-License-Identifier: Apache-2.0
/// @file
/// The only implementation of `Certificate`, based on OpenSSL.

#pragma once

#include "crypto/key_contexts.h"
#include "crypto/openssl_handles.h"
#include "crypto/public_key.h"

#include <tarvel/crypto/certificate.h>

namespace Tarvel::Crypto {

class CertificateImpl final : public Certificate {
public:
  /// @throws CryptoException when `data` is not exactly one certificate in DER;
  ///         InvalidStateException when OpenSSL has cleaned itself up; OutOfMemoryException.
  CertificateImpl(const std::uint8_t *data, std::size_t length);

  const std::vector<std::uint8_t> &GetDer() const noexcept override { return m_der; }
  std::string GetSubject() const override;
  std::string GetIssuer() const override;
  std::string GetSha256Thumbprint() const override;
  System::DateTime GetNotBefore() const override { return System::DateTimeFromUtc(m_notBefore, false); }
  System::DateTime GetNotAfter() const override { return System::DateTimeFromUtc(m_notAfter, false); }
  std::string ToPem() const override;

  KeyKind GetKeyKind() const noexcept { return m_keyKind; }
  unsigned GetKeyBits() const noexcept { return m_keyBits; }
  bool HasAcceptableExponent() const noexcept { return m_hasAcceptableExponent; }
  KeyContexts &GetVerifyContexts() const noexcept { return m_verifyContexts; }

  /// Owned by the certificate. The key is null when OpenSSL does not know its algorithm.
  X509 *GetNative() const noexcept { return m_native.get(); }
  EVP_PKEY *GetNativeKey() const noexcept { return m_nativeKey; }

private:
  ~CertificateImpl() override = default;

  std::vector<std::uint8_t> m_der;
  CertificateHandle m_native;
  EVP_PKEY *m_nativeKey = nullptr; // owned by m_native
  KeyKind m_keyKind = KeyKind::OTHER;
  unsigned m_keyBits = 0;
  bool m_hasAcceptableExponent = false;
  std::int64_t m_notBefore = 0; // microseconds since the epoch
  std::int64_t m_notAfter = 0;
  mutable KeyContexts m_verifyContexts;
};

/// Whether an RSA key with this public exponent can be used: with the exponent 1, anyone can sign; for an even exponent,
/// there is no private key (RFC 8017, section 3.1).
bool IsExponentSound(const BIGNUM *exponent) noexcept;

/// Downcasts `certificate`.
/// @throws TypeMismatchException when it is an instance of another class.
const CertificateImpl &AsImpl(const Certificate &certificate);

} // namespace Tarvel::Crypto
