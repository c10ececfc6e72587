// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SignatureRefusalText`, the message for a token that is refused because of its signature.

#pragma once

#include <string>
#include <string_view>

namespace SsoClient {

/// The text of the `InvalidSignatureException`.
/// @param error the text of the platform's exception; empty if the signature could be checked and is wrong
std::string SignatureRefusalText(std::string_view error);

} // namespace SsoClient
