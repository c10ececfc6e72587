// SPDX-License-Identifier: Apache-2.0
/// @file
/// X.509 certificates.

#pragma once

#include <tarvel/core/exception.h>
#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/system/date_time.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace Tarvel::Crypto {

/// A certificate or a key, or a file that contains them, is not valid; the message says what is wrong and where, and
/// includes OpenSSL's own text. Every function that uses OpenSSL may also throw two exceptions that say nothing about
/// its input: `InvalidStateException` when OpenSSL has cleaned itself up because the process is ending, and
/// `OutOfMemoryException`.
class TARVEL_API CryptoException : public Exception {
  TARVEL_EXCEPTION_BODY(CryptoException, Exception);
};

/// A certificate (RFC 5280) with its public key. Immutable; safe on any thread.
class TARVEL_API Certificate : public Object {
public:
  /// The DER encoding; owned by the certificate.
  virtual const std::vector<std::uint8_t> &GetDer() const noexcept = 0;

  /// The subject's and the issuer's distinguished name in the form of RFC 2253, such as "CN=sts,O=Example".
  virtual std::string GetSubject() const = 0;
  virtual std::string GetIssuer() const = 0;

  /// SHA-256 over the DER encoding, 64 lower-case hexadecimal digits.
  virtual std::string GetSha256Thumbprint() const = 0;

  /// The first and the last moment at which the certificate is valid.
  virtual System::DateTime GetNotBefore() const = 0;
  virtual System::DateTime GetNotAfter() const = 0;

  /// The certificate as PEM text.
  virtual std::string ToPem() const = 0;

protected:
  ~Certificate() override;
};

/// Certificates in order. Elements may be null only where a comment says so.
using CertificateList = std::vector<Ref<const Certificate>>;

/// Decodes the certificate in DER form that the `length` bytes at `data` contain.
/// @throws CryptoException when it cannot be decoded, or further bytes follow it.
TARVEL_API Ref<const Certificate> CreateCertificateFromDer(const std::uint8_t *data, std::size_t length);

/// The first certificate in PEM text.
/// @throws CryptoException when there is no certificate, or it cannot be decoded.
TARVEL_API Ref<const Certificate> CreateCertificateFromPem(std::string_view pem);

/// All certificates of PEM text, in order: at least one.
/// @throws CryptoException when there is no certificate, one cannot be decoded, or the text contains a private key.
TARVEL_API CertificateList CreateCertificatesFromPem(std::string_view pem);

/// All certificates of a file, which contains PEM text or one certificate in DER form.
/// @throws IOException when the file cannot be read.
/// @throws CryptoException as `CreateCertificatesFromPem` does; the message begins with the path.
TARVEL_API CertificateList LoadCertificates(const std::string &path);

} // namespace Tarvel::Crypto
