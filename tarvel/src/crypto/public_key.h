// SPDX-License-Identifier: Apache-2.0
/// @file
/// Checking signature values with a public key, and making them with a private key.

#pragma once

#include "crypto/digest.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/crypto/verifying_key.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace Tarvel::Crypto {

class PreparedKey;

enum class SignatureScheme { RSA_PKCS1, RSA_PSS, ECDSA };

enum class KeyKind { RSA, EC_P256, EC_P384, EC_P521, OTHER };

/// A shorter RSA key is not accepted.
constexpr unsigned MIN_RSA_BITS = 2048;

/// The key of a certificate or of a verifying key, which owns it.
/// @throws TypeMismatchException for an object that this library has not made.
const PreparedKey &GetPreparedKey(const Certificate &certificate);
const PreparedKey &GetPreparedKey(const VerifyingKey &key);

/// The kind of the certificate's public key. `bits` is set to the size of the RSA modulus or of the curve's order.
KeyKind GetKeyKind(const Certificate &certificate, unsigned &bits);

/// Whether an RSA key's public exponent is odd and at least 3; true for other kinds of keys.
bool HasAcceptableExponent(const Certificate &certificate);

/// Why no signature by the key, or by the certificate's key, is accepted, with any scheme; empty if there is no such reason.
/// An accepted key is RSA with at least `MIN_RSA_BITS` and an acceptable exponent, or EC on P-256, P-384 or P-521.
std::string RefuseKey(const PreparedKey &key);
std::string RefuseKey(const Certificate &certificate);

/// The same for a key of this kind and size. The exponent only matters for RSA.
std::string RefuseKey(KeyKind kind, unsigned bits, bool hasAcceptableExponent);

/// Whether `signature` is the signature by the key, or by the certificate's key, over a message with that digest. An ECDSA value is r
/// and s one after the other, as in XML Signature (RFC 4050, section 3.3). RSA-PSS uses MGF1 with the same digest, and
/// a salt as long as the digest. False for malformed values, and when the key does not match the scheme. Safe on any
/// thread; costs little beyond the arithmetic.
/// @throws CryptoException when the cryptographic library itself fails; InvalidStateException when it has cleaned itself up;
///         OutOfMemoryException. An exception says nothing about the signature.
bool VerifyDigest(const PreparedKey &key, SignatureScheme scheme, DigestAlgorithm algorithm, const std::uint8_t *digest,
                  const std::uint8_t *signature, std::size_t signatureLength);
bool VerifyDigest(const Certificate &certificate, SignatureScheme scheme, DigestAlgorithm algorithm,
                  const std::uint8_t *digest, const std::uint8_t *signature, std::size_t signatureLength);

/// The signature over a message with that digest, in the same encodings.
/// @throws CryptoException when the key does not match the scheme or the cryptographic library fails; InvalidStateException
///         when it has cleaned itself up; OutOfMemoryException.
std::vector<std::uint8_t> SignDigest(const PrivateKey &key, SignatureScheme scheme, DigestAlgorithm algorithm,
                                     const std::uint8_t *digest);

} // namespace Tarvel::Crypto
