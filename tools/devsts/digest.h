// SPDX-License-Identifier: Apache-2.0
/// @file
/// SHA-256, by OpenSSL.

#pragma once

#include <string>
#include <vector>

namespace DevSts {

/// The SHA-256 digest, as 64 lower-case hexadecimal digits.
std::string Sha256Text(const std::vector<unsigned char> &octets);

} // namespace DevSts
