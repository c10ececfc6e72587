// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient acquire`: asks the service for a token.

#include "command.h"
#include "connection.h"
#include "credentials.h"
#include "dialect_options.h"
#include "identity.h"
#include "interruption.h"
#include "operation_events.h"
#include "refused_token.h"
#include "token_output.h"
#include "token_spec_options.h"
#include "trust.h"

#include <memory>

namespace SsoClient::Tool {
namespace {

struct AcquireOptions {
  ConnectionOptions connection;
  DialectOptions dialect;
  TrustOptions trust;
  CredentialsOptions credentials;
  IdentityOptions identity;
  TokenSpecOptions token;
  TokenOutputOptions tokenOutput;
};

ExitCode Acquire(const AcquireOptions &options, const OutputOptions &output) {
  const TokenSpec spec = ToTokenSpec(options.token);
  const bool hasIdentity = options.identity.IsGiven();
  const CredentialsKind &kind = ChooseCredentials(options.credentials, hasIdentity);
  kind.check(spec, hasIdentity);
  InputClaims claims;
  ClaimInput(options.credentials, claims);
  CheckIdentity(options.identity, claims);
  CheckConnection(options.connection);
  ServiceOptions serviceOptions;
  serviceOptions.dialect = ToDialect(options.dialect);
  CheckSpecFits(spec, serviceOptions.dialect);
  CheckTokenOutput(options.tokenOutput, output);

  const Tarvel::Crypto::CertificateList trusted = LoadTrusted(options.trust, output);
  const VerifyOptions verifyOptions = VerifyOptionsOf(options.trust);
  RefusedToken refused(options.tokenOutput, trusted, verifyOptions, output);
  serviceOptions.verifyOptions.profile = verifyOptions.profile; // the tolerance is checked below
  serviceOptions.observer = ObserverFor(output);
  serviceOptions.refusedTokenSink = refused.GetSink();
  const auto client = CreateClient(options.connection, trusted, LoadIdentity(options.identity), serviceOptions);
  const IssuedToken issued = refused.Explain([&] {
    const DoubtedCredential given = kind.read({spec, serviceOptions.dialect, hasIdentity, options.credentials,
                                               options.connection.url, trusted, verifyOptions});
    IssuedToken acquired =
        AskForToken([&] { return client->Acquire(given.credential, spec, GetCallOptions()); }, given.doubt, output);
    RequireWithinTolerance(*acquired.token, trusted, verifyOptions, refused.GetSink());
    return acquired;
  });
  WriteToken(issued, spec, serviceOptions.dialect, options.trust.toleranceSec, options.tokenOutput, output);
  return ExitCode::DONE;
}

} // namespace

Action DefineAcquire(CLI::App &app, const OutputOptions &output) {
  const auto options = std::make_shared<AcquireOptions>();
  AddConnectionOptions(app, options->connection);
  AddDialectOptions(app, options->dialect);
  AddCredentialsOptions(app, options->credentials);
  AddIdentityOptions(app, options->identity);
  AddTokenSpecOptions(app, options->token);
  AddTrustOptions(app, options->trust);
  AddTokenOutputOptions(app, options->tokenOutput);
  return [options, &output] { return Acquire(*options, output); };
}

} // namespace SsoClient::Tool
