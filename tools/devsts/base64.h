// SPDX-License-Identifier: Apache-2.0
/// @file
/// Base64, by OpenSSL.

#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace DevSts {

/// The octets; white space is allowed in the text. Empty when the text is not Base64, or longer than 64 KiB.
std::vector<unsigned char> DecodeBase64(std::string_view text);

/// Base64 without line breaks.
std::string EncodeBase64(const std::vector<unsigned char> &bytes);

} // namespace DevSts
