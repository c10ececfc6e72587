// SPDX-License-Identifier: Apache-2.0
/// @file
/// Public keys in the form SubjectPublicKeyInfo (RFC 5280, section 4.1.2.7), made from the numbers in a message or
/// copied from a certificate.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/crypto/certificate.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace Tarvel::Crypto {

/// Larger numbers of an RSA key are not read, because computing with them takes long.
constexpr std::size_t MAX_RSA_MODULUS_BITS = 16384;
constexpr std::size_t MAX_RSA_EXPONENT_BITS = 256;

/// The elliptic curves on which keys are accepted.
enum class NamedCurve { P256, P384, P521 };

/// A public key that was made from its numbers.
struct SubjectPublicKey {
  std::vector<std::uint8_t> der; ///< SubjectPublicKeyInfo in DER; empty if a number is above its limit

  /// Why no signature by this key is accepted; empty if there is no such reason. The rules are that of
  /// `CertificateFacts::keyRefusal` and the limits above.
  std::string refusal;
};

/// The RSA key of these two numbers: octets with the most significant one first. Zeros at the beginning are ignored.
/// This function and those below are safe on any thread.
/// @throws CryptoException when OpenSSL fails; InvalidStateException, OutOfMemoryException as in `CryptoException`.
TARVEL_API SubjectPublicKey MakeRsaPublicKey(const std::vector<std::uint8_t> &modulus,
                                             const std::vector<std::uint8_t> &exponent);

/// The EC key with this point: the octet 4, x and y (SEC 1, section 2.3.3, without compression).
/// @throws CryptoException when `point` is not a point of the curve in this form; InvalidStateException,
///         OutOfMemoryException as in `CryptoException`.
TARVEL_API SubjectPublicKey MakeEcPublicKey(NamedCurve curve, const std::vector<std::uint8_t> &point);

/// The key of `certificate`, of any algorithm and size: its SubjectPublicKeyInfo in DER, unchanged.
/// @throws TypeMismatchException for a certificate that this library has not made; CryptoException when OpenSSL fails;
///         InvalidStateException, OutOfMemoryException as in `CryptoException`.
TARVEL_API std::vector<std::uint8_t> GetSubjectPublicKey(const Certificate &certificate);

/// Whether `certificate` has the key `subjectPublicKeyInfo`, which is in DER. Keys are compared, not their encodings.
/// False if OpenSSL cannot read one of them.
/// @throws TypeMismatchException for a certificate that this library has not made; InvalidStateException,
///         OutOfMemoryException as in `CryptoException`.
TARVEL_API bool HasPublicKey(const Certificate &certificate, const std::vector<std::uint8_t> &subjectPublicKeyInfo);

} // namespace Tarvel::Crypto
