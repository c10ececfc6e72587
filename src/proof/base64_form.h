// SPDX-License-Identifier: Apache-2.0
/// @file
/// Base64 and base64url, for HTTP header fields and the parameters of requests.

#pragma once

#include <ssoclient/proof/http_request.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {

/// `octets` in this encoding. No other copy of the result is left in memory.
std::string EncodeBase64(std::string_view octets, TokenHeader::Encoding encoding);

/// The octets of `text`; nullopt if it is not exactly what `EncodeBase64` writes for some octets.
std::optional<std::vector<std::uint8_t>> DecodeBase64(std::string_view text, TokenHeader::Encoding encoding);

} // namespace SsoClient
