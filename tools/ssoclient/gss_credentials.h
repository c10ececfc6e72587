// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquiring a token by a Kerberos ticket, through the system's GSSAPI where the tool is built with it.

#pragma once

#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service.h>
#include <ssoclient/token_spec.h>

#include <memory>
#include <string>

namespace SsoClient::Tool {

struct GssOptions {
  bool isChosen = false;
  std::string service;         ///< empty: HTTP@ and the host of the token service's address
  std::string credentialCache; ///< empty: the default one, or none when there is a keytab
  std::string clientKeytab;    ///< empty: none
};

/// @throws UsageException when the tool is built without the GSSAPI.
void RequireGss();

/// @param url of the token service
std::shared_ptr<const SamlToken> AcquireByGss(const SecurityTokenService &service, const TokenSpec &spec,
                                              const GssOptions &options, const std::string &url);

} // namespace SsoClient::Tool
