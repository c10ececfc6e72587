// SPDX-License-Identifier: Apache-2.0
/// @file
/// Signatures over octets, outside of XML.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/crypto/message_digest.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/crypto/verifying_key.h>

#include <cstdint>
#include <string_view>
#include <vector>

namespace Tarvel::Crypto {

/// The signature by `key` over `bytes`: RSASSA-PKCS1-v1_5 (RFC 8017, section 8.2) for an RSA key; ECDSA (FIPS 186-5)
/// for an EC key, as r and s one after the other, each as long as the curve's order. Safe on any thread.
/// @throws TypeMismatchException for a key that this library has not made; CryptoException when OpenSSL or the
///         provider of the key fails; InvalidStateException, OutOfMemoryException as in `CryptoException`.
TARVEL_API std::vector<std::uint8_t> SignOctets(const PrivateKey &key, HashAlgorithm algorithm, std::string_view bytes);

/// Whether `signature` is the signature by `key` over `bytes`, in the same encodings. False for malformed values, and
/// for a key with which no signature is accepted (`VerifyingKey::GetRefusal`). Safe on any thread.
/// @throws what `SignOctets` throws. An exception says nothing about the signature.
TARVEL_API bool VerifyOctets(const VerifyingKey &key, HashAlgorithm algorithm, std::string_view bytes,
                             const std::vector<std::uint8_t> &signature);

} // namespace Tarvel::Crypto
