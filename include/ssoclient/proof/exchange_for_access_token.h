// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ExchangeForAccessToken`, the parameters with which an OAuth 2.0 service exchanges a token for an access token.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/saml_token.h>

#include <boost/optional.hpp>

#include <string>
#include <utility>
#include <vector>

namespace SsoClient {

/// What a request for an access token contains in addition to the token.
struct AccessTokenOptions {
  boost::optional<std::string> scope;    ///< RFC 6749, section 3.3
  boost::optional<std::string> clientId; ///< RFC 6749, section 2.3.1
  std::vector<std::string> resources;    ///< RFC 8707
};

/// A request for an access token. It is built and not sent.
struct AccessTokenRequest {
  std::vector<std::pair<std::string, std::string>> parameters; ///< names and values, not encoded
  std::string body; ///< the parameters as application/x-www-form-urlencoded; secret, it contains the token
};

/// The parameters of the SAML 2.0 bearer assertion grant (RFC 7522, section 2.1) (...)
SSOCLIENT_API AccessTokenRequest ExchangeForAccessToken(const SamlToken &token, const AccessTokenOptions &options = {});

} // namespace SsoClient
