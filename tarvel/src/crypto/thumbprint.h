// SPDX-License-Identifier: Apache-2.0
/// @file
/// The thumbprint of an encoded certificate or key.

#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace Tarvel::Crypto {

/// SHA-256 over `der`, 64 lower-case hexadecimal digits.
/// @throws CryptoException when OpenSSL fails; InvalidStateException when it has cleaned itself up; OutOfMemoryException.
std::string MakeSha256Thumbprint(const std::vector<std::uint8_t> &der);

} // namespace Tarvel::Crypto
