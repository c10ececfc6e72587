// SPDX-License-Identifier: Apache-2.0
/// @file
/// The content of a token cache file.
///
/// The file is text. Each line has a name, a colon, a blank and a value, except the first and the last line and those
/// of the token. In a value, a backslash and each control character is written as a backslash, "x" and two hexadecimal
/// digits:
///
///     ssoclient token cache 1
///     service: https://sts.corp.example/sts
///     owner: alice@corp.example
///     options: profile=1:0 tokenType=0: appliesTo=0: useKey=1:0 delegation=1:0 identity=
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

/// A token in the text of a cache file. The members are views into the text.
struct CachedToken {
  std::string_view id; ///< as it is written in the file
  std::string_view xml;
};

/// The text of a file with this token.
/// @throws std::bad_alloc
std::string WriteCacheText(const CacheBinding &binding, const SamlToken &token);

/// Whether the text begins like that of a cache file of any version, as far as it reaches. An empty text does.
bool IsCacheText(std::string_view text) noexcept;

/// The token in the text; `boost::none` if the text is not complete, or has another version or another binding.
/// @param text must exist as long as the result is used
/// @throws std::bad_alloc
boost::optional<CachedToken> FindCachedToken(std::string_view text, const CacheBinding &binding);

/// A value as it is written in the file.
/// @throws std::bad_alloc
std::string CacheValue(std::string_view value);

} // namespace SsoClient
