// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ExchangeForAccessToken`, the parameters with which an OAuth 2.0 service exchanges a token for an access token.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/saml_token.h>
#include <tarvel/core/secret_text.h>

#include <boost/optional.hpp>

#include <string>
#include <utility>
#include <vector>

namespace SsoClient {

/// What a request for an access token contains in addition to the token.
struct AccessTokenOptions {
  boost::optional<std::string> scope;    ///< scopes with one blank between two of them (RFC 6749, section 3.3)
  boost::optional<std::string> clientId; ///< of a client that does not authenticate otherwise (RFC 6749, section 3.2.1)
  std::vector<std::string> resources;    ///< absolute URIs without fragments: what the access token is for (RFC 8707)
};

/// A request for an access token. It is built and not sent. Both members are secret, because they contain the token; their
/// memory is overwritten before it is freed.
struct AccessTokenRequest {
  /// Names and values, not encoded, in the order of the body: for an OAuth library that encodes them.
  std::vector<std::pair<std::string, Tarvel::SecretText>> parameters;

  /// The same in the form application/x-www-form-urlencoded: the content of a POST request to the token endpoint, which must
  /// be reached through TLS.
  Tarvel::SecretText body;
};

/// The request of the SAML 2.0 bearer assertion grant (RFC 7522, section 2.1): `grant_type`, `assertion` (the token's XML in
/// base64url without padding) and what `options` have. The OAuth service requires that the token is for it: its audience
/// must be the service's (RFC 7522, section 3). Safe on any thread.
/// @param token a bearer token: the grant has no place for a proof of a key
/// @throws Tarvel::InvalidArgumentException when `token` is a holder-of-key token, or an option does not have its form.
SSOCLIENT_API AccessTokenRequest ExchangeForAccessToken(const SamlToken &token, const AccessTokenOptions &options = {});

} // namespace SsoClient
