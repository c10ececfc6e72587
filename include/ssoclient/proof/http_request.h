// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HttpRequest`, the parts of an HTTP request that are signed, and how a token is written into a header.

#pragma once

#include <ssoclient/export.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient {

/// An HTTP request, as a client is about to send it, or as a service has received it.
struct HttpRequest {
  std::string method;    ///< such as "POST"; letter case matters
  std::string targetUri; ///< the absolute URI of the target, without a fragment: what the client asked for
  /// Names and values of the header fields, in the order of the message. Letter case of names does not matter.
  std::vector<std::pair<std::string, std::string>> headers;
  /// The octets of the content, after transfer codings are removed; unset for a request without content.
  boost::optional<std::string> body;
};

/// How the token is written into a header field.
struct TokenHeader {
  /// How the octets of the token become text.
  enum class Encoding : std::int32_t {
    BASE64 = 0, ///< RFC 4648, section 4
    BASE64URL   ///< RFC 4648, section 5, without padding
  };

  std::string name = "Authorization";   ///< of the field
  std::string before = "SAML ";         ///< before the encoded token; compared byte for byte
  std::string after;                    ///< after the encoded token; compared byte for byte
  Encoding encoding = Encoding::BASE64; ///< of the token
};

} // namespace SsoClient
