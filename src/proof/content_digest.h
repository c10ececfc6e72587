// SPDX-License-Identifier: Apache-2.0
/// @file
/// The header field Content-Digest (RFC 9530).

#pragma once

#include <string>
#include <string_view>

namespace SsoClient {

/// The name of the field, in lower case.
constexpr const char *CONTENT_DIGEST = "content-digest";

/// The value of the field, with a digest by SHA-256.
std::string WriteContentDigest(std::string_view content);

/// Checks each digest of the field by sha-256 and sha-512. Digests by other algorithms are ignored.
/// @throws InvalidMessageException when the field is malformed, or has no digest by either of these algorithms.
/// @throws InvalidProofException when a digest is not that of `content`.
void CheckContentDigest(std::string_view field, std::string_view content);

} // namespace SsoClient
