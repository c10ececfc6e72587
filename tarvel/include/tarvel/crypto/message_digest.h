// SPDX-License-Identifier: Apache-2.0
/// @file
/// Digests of octets.

#pragma once

#include <tarvel/core/export.h>

#include <cstdint>
#include <string_view>
#include <vector>

namespace Tarvel::Crypto {

/// The digest algorithms of FIPS 180-4 that are used.
enum class HashAlgorithm : std::int32_t {
  SHA256 = 0, ///< 32 octets
  SHA384,     ///< 48 octets
  SHA512      ///< 64 octets
};

/// The digest of `bytes`. Safe on any thread.
/// @throws CryptoException when OpenSSL fails; InvalidStateException, OutOfMemoryException as in `CryptoException`.
TARVEL_API std::vector<std::uint8_t> ComputeDigest(HashAlgorithm algorithm, std::string_view bytes);

} // namespace Tarvel::Crypto
