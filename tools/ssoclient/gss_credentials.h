// SPDX-License-Identifier: Apache-2.0
/// @file
/// The credential of a Kerberos ticket, through the system's GSSAPI where the tool is built with it.

#pragma once

#include <ssoclient/client/credential.h>

#include <string>

namespace SsoClient::Tool {

struct GssOptions {
  bool isChosen = false;
  std::string client;          ///< empty: the first principal of the cache or the keytab
  std::string service;         ///< empty: HTTP@ and the host of the token service's address
  std::string credentialCache; ///< empty: the default one, or none when there is a keytab
  std::string clientKeytab;    ///< empty: none
};

/// @throws UsageException when the tool is built without the GSSAPI.
void RequireGss();

/// The credential. The ticket is looked for only when a token is acquired.
/// @param url of the token service
/// @throws Tarvel::InvalidArgumentException for a service name that is empty or lacks a part
NegotiationCredential ToCredential(const GssOptions &options, const std::string &url);

} // namespace SsoClient::Tool
