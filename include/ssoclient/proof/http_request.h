// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HttpRequest`, the parts of an HTTP request that are signed, and how a token is written into a header field.

#pragma once

#include <ssoclient/export.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient {

/// How many octets the names and values of a request's header fields may have together. Most servers accept far less: a
/// common limit for all fields is 8 KiB, and a token with a certificate has 4 to 8 KB before Base64 makes it a third
/// longer.
constexpr std::size_t MAX_HTTP_HEADER_OCTETS = 1'048'576;

/// An HTTP request, as a client is about to send it, or as a service has received it.
struct HttpRequest {
  std::string method; ///< such as "POST"; letter case matters

  /// The absolute http or https URI of the target, without a fragment and without user information: what the client
  /// asked for. A service should use scheme and authority of its own configuration, not of the request. The
  /// URI is signed as it is written, so the client must sign what the service will see.
  std::string targetUri;

  /// Names and values of the header fields, in the order of the message. Letter case of names does not matter. A field
  /// may appear several times.
  std::vector<std::pair<std::string, std::string>> headers;

  /// The octets of the content: without transfer codings, and still with content codings, such as gzip. Unset for a
  /// request without content.
  boost::optional<std::string> body;
};

/// How the token is written into a header field. Client and service must agree on it: there is no standard for it.
/// "SAML", the default scheme in Authorization, is not registered, and its letter case matters.
struct TokenHeader {
  /// How the octets of the token become text.
  enum class Encoding : std::int32_t {
    BASE64 = 0, ///< RFC 4648, section 4, with padding
    BASE64URL   ///< RFC 4648, section 5, without padding
  };

  /// Of the field; letter case does not matter. Not Signature, Signature-Input or Content-Digest, where the proof is.
  std::string name = "Authorization";

  std::string before = "SAML ";         ///< before the encoded token; printable ASCII, compared octet by octet
  std::string after;                    ///< after the encoded token; printable ASCII, compared octet by octet
  Encoding encoding = Encoding::BASE64; ///< of the token
};

} // namespace SsoClient
