// SPDX-License-Identifier: Apache-2.0
/// @file
/// The only implementation of `Certificate`, based on OpenSSL.

#pragma once

#include "crypto/openssl_handles.h"
#include "crypto/prepared_key.h"

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

  const PreparedKey &GetKey() const noexcept { return *m_key; }
  Ref<const PreparedKey> ShareKey() const noexcept { return m_key; }
  /// The SubjectPublicKeyInfo in DER.
  const std::vector<std::uint8_t> &GetKeyDer() const noexcept { return m_keyDer; }

  /// Owned by the certificate. The key is null when OpenSSL does not know its algorithm.
  X509 *GetNative() const noexcept { return m_native.get(); }
  EVP_PKEY *GetNativeKey() const noexcept { return m_key->GetNative(); }

private:
  ~CertificateImpl() override = default;

  std::vector<std::uint8_t> m_der;
  CertificateHandle m_native;
  Ref<const PreparedKey> m_key;       // never null after construction
  std::vector<std::uint8_t> m_keyDer; // encoded once: each proof of a token's key needs it
  std::int64_t m_notBefore = 0;       // microseconds since the epoch
  std::int64_t m_notAfter = 0;
};

/// Downcasts `certificate`.
/// @throws TypeMismatchException when it is an instance of another class.
const CertificateImpl &AsImpl(const Certificate &certificate);

} // namespace Tarvel::Crypto
