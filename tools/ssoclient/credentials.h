// SPDX-License-Identifier: Apache-2.0
/// @file
/// The kinds of credentials by which a token can be acquired.

#pragma once

#include "gss_credentials.h"
#include "input_descriptor.h"
#include "secret_input.h"
#include "service_call.h"
#include "trust.h"

#include <ssoclient/client/credential.h>
#include <ssoclient/service_dialect.h>
#include <ssoclient/token_spec.h>

#include <cstdint>
#include <string>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

struct CredentialsOptions {
  std::string user;
  SecretOptions password{"password", {}, -1};
  std::string tokenFile;
  GssOptions gss;
};

/// What is needed to read a credential of any kind.
struct CredentialsCall {
  const TokenSpec &spec;
  const ServiceDialect &dialect;
  bool hasIdentity;
  const CredentialsOptions &credentials;
  const std::string &url; ///< of the service
  const Tarvel::Crypto::CertificateList &trusted;
  const VerifyOptions &verifyOptions;
};

/// A credential, and the reason why the service might refuse the request that uses it.
struct DoubtedCredential {
  Credential credential;
  const Doubt *doubt; ///< null when there is none
};

/// One row of the table of kinds.
struct CredentialsKind {
  const char *option; ///< the option that chooses the kind; null for the kind that needs only the identity
  bool (*isChosen)(const CredentialsOptions &credentials);

  /// @throws UsageException when the rest of the command line contradicts the kind.
  void (*check)(const TokenSpec &spec, bool hasIdentity);

  /// Reads what the kind needs.
  DoubtedCredential (*read)(const CredentialsCall &call);
};

void AddCredentialsOptions(CLI::App &app, CredentialsOptions &options);

/// @throws UsageException when another option reads the same descriptor.
void ClaimInput(const CredentialsOptions &options, InputClaims &claims);

/// The kind that the command line chooses. If it chooses none, the kind that needs only the identity.
/// @throws UsageException when it chooses several, or none and there is no identity.
const CredentialsKind &ChooseCredentials(const CredentialsOptions &options, bool hasIdentity);

} // namespace SsoClient::Tool
