// SPDX-License-Identifier: Apache-2.0
/// @file
/// Public keys that are prepared for the verification of signatures.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

#include <cstdint>
#include <string>
#include <vector>

namespace Tarvel::Crypto {

/// A public key, with or without a certificate. Immutable; safe on any thread.
class TARVEL_API VerifyingKey : public Object {
public:
  /// SubjectPublicKeyInfo in DER (RFC 5280, section 4.1.2.7); owned by the key.
  virtual const std::vector<std::uint8_t> &GetSubjectPublicKey() const noexcept = 0;

  /// "RSA", "EC" for a key on any curve, or empty for every other kind of key.
  virtual std::string GetAlgorithm() const = 0;

  /// Size of the RSA modulus or of the curve's order, in bits; 0 for other kinds of keys.
  virtual unsigned GetBits() const noexcept = 0;

  /// Why no signature by this key is accepted: empty for RSA keys of at least 2048 bits with a sound exponent, and for
  /// keys on the curves P-256, P-384 and P-521.
  virtual std::string GetRefusal() const = 0;

  /// SHA-256 over `GetSubjectPublicKey`, 64 lower-case hexadecimal digits.
  virtual std::string GetSha256Thumbprint() const = 0;

protected:
  ~VerifyingKey() override;
};

/// The key with this SubjectPublicKeyInfo, which must be in DER. Every key that OpenSSL knows can be read, including
/// keys with which no signature is accepted. This function and those below are safe on any thread.
/// @throws CryptoException when it cannot be decoded, is not in DER, or further bytes follow it; InvalidStateException,
///         OutOfMemoryException as in `CryptoException`, like the functions below.
TARVEL_API Ref<const VerifyingKey> CreateVerifyingKey(const std::vector<std::uint8_t> &subjectPublicKeyInfo);

/// The key of `certificate`, which must not be null, of any algorithm. It shares what the certificate has prepared.
/// @throws TypeMismatchException for a certificate that this library has not made; CryptoException when OpenSSL fails.
TARVEL_API Ref<const VerifyingKey> CreateVerifyingKey(const Ref<const Certificate> &certificate);

/// The public key that belongs to `key`. Works for keys that cannot be exported, too.
/// @throws TypeMismatchException for a key that this library has not made; CryptoException when OpenSSL fails.
TARVEL_API Ref<const VerifyingKey> CreateVerifyingKey(const PrivateKey &key);

/// Whether both are the same key. Keys are compared, not their encodings. Keys of an algorithm that OpenSSL does not
/// know are the same if their encodings are.
/// @throws TypeMismatchException for a key that this library has not made.
TARVEL_API bool IsSameKey(const VerifyingKey &left, const VerifyingKey &right);

} // namespace Tarvel::Crypto
