// SPDX-License-Identifier: Apache-2.0
/// @file
/// Base64, by OpenSSL.

#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace DevSts {

/// The octets, white space allowed in the text; empty when it is none, or longer than 64 KiB.
std::vector<unsigned char> DecodeBase64(std::string_view text);

/// In one line.
std::string EncodeBase64(const std::vector<unsigned char> &bytes);

} // namespace DevSts
