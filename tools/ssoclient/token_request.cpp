// SPDX-License-Identifier: Apache-2.0

#include "token_request.h"

#include <utility>

namespace SsoClient::Tool {

void AddTokenRequestOptions(CLI::App &app, TokenRequestOptions &options) {
  AddConnectionOptions(app, options.connection);
  AddDialectOptions(app, options.dialect);
  AddCredentialsOptions(app, options.credentials);
  AddIdentityOptions(app, options.identity);
  AddTokenSpecOptions(app, options.token);
  AddTrustOptions(app, options.trust);
  AddTokenOutputOptions(app, options.tokenOutput);
}

TokenRequest::TokenRequest(const TokenRequestOptions &options, const OutputOptions &output,
                           std::shared_ptr<OperationObserver> observer)
    : m_options(options), m_output(output), m_spec(ToTokenSpec(options.token)) {
  const bool hasIdentity = options.identity.IsGiven();
  m_kind = &ChooseCredentials(options.credentials, hasIdentity);
  m_kind->check(m_spec, hasIdentity);
  InputClaims claims;
  ClaimInput(options.credentials, claims);
  CheckIdentity(options.identity, claims);
  CheckConnection(options.connection);
  m_dialect = ToDialect(options.dialect);
  CheckSpecFits(m_spec, m_dialect);
  CheckTokenOutput(options.tokenOutput, output);

  m_trusted = LoadTrusted(options.trust, output);
  m_verifyOptions = VerifyOptionsOf(options.trust);
  m_refused.emplace(options.tokenOutput, m_trusted, m_verifyOptions, output);
  ServiceOptions serviceOptions;
  serviceOptions.dialect = m_dialect;
  serviceOptions.verifyOptions.profile = m_verifyOptions.profile; // `Write` checks the tolerance
  serviceOptions.observer = std::move(observer);
  serviceOptions.refusedTokenSink = m_refused->GetSink();
  m_identity = LoadIdentity(options.identity);
  m_client = CreateClient(options.connection, m_trusted, m_identity, serviceOptions);
}

DoubtedCredential TokenRequest::ReadCredential() const {
  return m_kind->read({m_spec, m_dialect, m_options.identity.IsGiven(), m_options.credentials, m_options.connection.url,
                       m_trusted, m_verifyOptions});
}

bool TokenRequest::IsAccepted(const SamlToken &token) const {
  try {
    RequireWithinTolerance(token, m_trusted, m_verifyOptions, [](const std::string & /*xml*/) {});
    return true;
  } catch (const InvalidTokenException &) {
    return false;
  }
}

void TokenRequest::Write(const std::function<IssuedToken()> &call) const {
  const IssuedToken issued = m_refused->Explain([&] {
    IssuedToken token = call();
    RequireWithinTolerance(*token.token, m_trusted, m_verifyOptions, m_refused->GetSink());
    return token;
  });
  WriteToken(issued, m_spec, m_dialect, m_options.trust.toleranceSec, m_options.tokenOutput, m_output);
}

} // namespace SsoClient::Tool
