// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient renew`: asks the service for a new token in place of one that is bound to the caller's key.

#include "command.h"
#include "connection.h"
#include "dialect_options.h"
#include "identity.h"
#include "interruption.h"
#include "operation_events.h"
#include "refused_token.h"
#include "service_call.h"
#include "token_output.h"
#include "token_spec_options.h"
#include "trust.h"

#include <memory>
#include <string>

namespace SsoClient::Tool {
namespace {

struct RenewOptions {
  ConnectionOptions connection;
  DialectOptions dialect;
  TrustOptions trust;
  IdentityOptions identity;
  std::string lifetime = DEFAULT_LIFETIME;
  TokenOutputOptions tokenOutput;
  std::string file;
};

ExitCode Renew(const RenewOptions &options, const OutputOptions &output) {
  TokenSpec spec; // a renewal asks only for a lifetime
  spec.tokenLifetimeSec = ParseLifetime(options.lifetime);
  if (!options.identity.IsGiven()) {
    throw UsageException("renewing needs the key that the token is bound to; give --cert and --key, or --p12");
  }
  InputClaims claims;
  claims.ClaimFile(options.file, "FILE");
  CheckIdentity(options.identity, claims);
  CheckConnection(options.connection);
  ServiceOptions serviceOptions;
  serviceOptions.dialect = ToDialect(options.dialect);
  CheckTokenOutput(options.tokenOutput, output);

  const Tarvel::Crypto::CertificateList trusted = LoadTrusted(options.trust, output);
  const VerifyOptions verifyOptions = VerifyOptionsOf(options.trust);
  const auto given = ReadToken(options.file, trusted, verifyOptions);
  RefusedToken refused(options.tokenOutput, trusted, verifyOptions, output);
  serviceOptions.verifyOptions.profile = verifyOptions.profile; // the tolerance is checked below
  serviceOptions.observer = ObserverFor(output);
  serviceOptions.refusedTokenSink = refused.GetSink();
  const auto client = CreateClient(options.connection, trusted, LoadIdentity(options.identity), serviceOptions);
  const IssuedToken issued = refused.Explain([&] {
    IssuedToken renewed =
        AskForToken([&] { return client->Renew(given, spec.tokenLifetimeSec, GetCallOptions()); }, nullptr, output);
    RequireWithinTolerance(*renewed.token, trusted, verifyOptions, refused.GetSink());
    return renewed;
  });
  WriteToken(issued, spec, serviceOptions.dialect, options.trust.toleranceSec, options.tokenOutput, output);
  return ExitCode::DONE;
}

} // namespace

Action DefineRenew(CLI::App &app, const OutputOptions &output) {
  const auto options = std::make_shared<RenewOptions>();
  AddConnectionOptions(app, options->connection);
  AddDialectOptions(app, options->dialect);
  AddIdentityOptions(app, options->identity);
  AddLifetimeOption(app, options->lifetime);
  AddTrustOptions(app, options->trust);
  AddTokenOutputOptions(app, options->tokenOutput);
  AddTokenArgument(app, options->file);
  return [options, &output] { return Renew(*options, output); };
}

} // namespace SsoClient::Tool
