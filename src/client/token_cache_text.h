// SPDX-License-Identifier: Apache-2.0
/// @file
/// The content of a token cache file.
///
/// It is text. Each line but those of the token has a name, a colon and a blank before its value, in which a backslash and
/// each control character is written as a backslash, "x" and two hexadecimal digits:
///
///     ssoclient token cache 1
///     service: https://sts.corp.example/sts
///     owner: alice@corp.example
///     options: strict
///     lifetime: 3600
///     audience: https://billing.corp.example      (one line for each)
///     advice: urn:example:source                  (for each, with its attributes and their values in the next lines)
///     attribute: urn:example:name
///     value: text
///     delegable: false
///     delegate to: billing@corp.example           (only if the token is delegated)
///     renewable: false
///     confirmation: 0
///     token: _4f1c...                             (the identifier of the token)
///     end: 2026-05-07T09:03:01.042Z               (of the token, for people that read the file)
///     octets: 5120                                (of the token's XML, which begins in the next line)
///     <saml2:Assertion ...>
///     end of token cache
///
/// The lines before "token" are the binding. No line is derived from a password or a key; the token itself is in the file.

#pragma once

#include "client/token_cache_file.h"

#include <boost/optional.hpp>

#include <string>
#include <string_view>

namespace SsoClient {

/// A token as a cache file has it. Views into the text.
struct CachedToken {
  std::string_view id; ///< as the file has it
  std::string_view xml;
};

/// The text of a file with this token.
/// @throws std::bad_alloc
std::string WriteCacheText(const CacheBinding &binding, const SamlToken &token);

/// Whether the text begins as that of a cache file of any version does, as far as it goes. An empty text does.
bool IsCacheText(std::string_view text) noexcept;

/// The token in the text; nothing if the text is not complete, has another version or another binding.
/// @param text must exist as long as the result is used
/// @throws std::bad_alloc
boost::optional<CachedToken> FindCachedToken(std::string_view text, const CacheBinding &binding);

/// A value in the form in which the file has it.
/// @throws std::bad_alloc
std::string CacheValue(std::string_view value);

} // namespace SsoClient
