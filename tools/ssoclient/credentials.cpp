// SPDX-License-Identifier: Apache-2.0

#include "credentials.h"

#include "exit_code.h"
#include "option.h"

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Credentials";

constexpr Doubt DELEGATION_WITHOUT_PROOF = {
    "with --delegate-to, the request asks for a token that is bound to the identity's key, but does not prove the key; "
    "services refuse that",
    "also give --bearer: with --user or --gss, a token for --delegate-to cannot be bound to a key"};

constexpr Doubt EXCHANGE_OF_BEARER_TOKEN = {
    "the token to exchange is a bearer token; services refuse to exchange those",
    "an exchange needs a holder-of-key token; acquire one with the identity, and without --bearer"};

/// A request for a delegated token is not signed, even when it asks for a token that is bound to a key. Services that
/// take the key from the certificate in wst:UseKey may grant it nevertheless.
const Doubt *DoubtAboutDelegation(const CredentialsCall &call) {
  const bool asksForBoundToken = call.hasIdentity && call.spec.confirmation == TokenSpec::CONFIRMATION_DEFAULT;
  const bool containsCertificate = call.dialect.useKey == ServiceDialect::UseKey::CERTIFICATE;
  return asksForBoundToken && call.spec.delegateTo && !containsCertificate ? &DELEGATION_WITHOUT_PROOF : nullptr;
}

void CheckNothing(const TokenSpec &, bool) {}

DoubtedCredential ReadPassword(const CredentialsCall &call) {
  const CredentialsOptions &credentials = call.credentials;
  return {
      PasswordCredential{credentials.user, ReadSecret(credentials.password, "Password for " + credentials.user + ": ")},
      DoubtAboutDelegation(call)};
}

void CheckExchange(const TokenSpec &, bool hasIdentity) {
  if (!hasIdentity) {
    throw UsageException("--token needs an identity to sign with; give --cert and --key, or --p12");
  }
}

DoubtedCredential ReadTokenToExchange(const CredentialsCall &call) {
  const auto given = ReadToken(call.credentials.tokenFile, call.trusted, call.verifyOptions);
  // The request's signature refers to the token, from which the service takes the key. A bearer token has no key.
  const Doubt *const doubt = given->GetConfirmationMethod() == SamlToken::BEARER ? &EXCHANGE_OF_BEARER_TOKEN : nullptr;
  return {TokenCredential{given}, doubt};
}

void CheckGss(const TokenSpec &, bool) {
  RequireGss();
}

DoubtedCredential UseTicket(const CredentialsCall &call) {
  return {ToCredential(call.credentials.gss, call.url), DoubtAboutDelegation(call)};
}

void CheckCertificate(const TokenSpec &spec, bool) {
  if (spec.confirmation != TokenSpec::CONFIRMATION_DEFAULT) {
    throw UsageException("--bearer cannot be combined with an identity alone, whose token is bound to its key");
  }
}

DoubtedCredential UseIdentity(const CredentialsCall & /*call*/) {
  return {CertificateCredential{}, nullptr};
}

constexpr CredentialsKind CHOSEN_KINDS[] = {
    {"--user", [](const CredentialsOptions &options) { return !options.user.empty(); }, CheckNothing, ReadPassword},
    {"--token", [](const CredentialsOptions &options) { return !options.tokenFile.empty(); }, CheckExchange,
     ReadTokenToExchange},
    {"--gss", [](const CredentialsOptions &options) { return options.gss.isChosen; }, CheckGss, UseTicket},
};

constexpr CredentialsKind IDENTITY_ALONE = {nullptr, nullptr, CheckCertificate, UseIdentity};

[[noreturn]] void ThrowNoneChosen() {
  std::string options;
  for (const CredentialsKind &kind : CHOSEN_KINDS) {
    options += std::string(kind.option) + ", ";
  }
  throw UsageException("there are no credentials; give " + options + "or an identity (--cert and --key, or --p12)");
}

void AddGssOptions(CLI::App &app, GssOptions &options) {
  const Option gss =
      AddFlag(app, "--gss", options.isChosen, "Acquire by a Kerberos ticket, negotiated through the GSSAPI")
          .Group(GROUP);
  AddOption(
      app, "--service", options.service,
      "The token service's principal, such as HTTP@host or HTTP/host@REALM; by default, HTTP@ and the host of --sts")
      .TypeName("PRINCIPAL")
      .Group(GROUP)
      .Needs(gss);
  AddOption(app, "--principal", options.client,
            "Principal whose ticket is used, such as alice@CORP.EXAMPLE; by default, the first of the cache or keytab")
      .TypeName("PRINCIPAL")
      .Group(GROUP)
      .Needs(gss);
  AddOption(app, "--ccache", options.credentialCache,
            "Credential cache with the ticket; by default, the Kerberos library's")
      .TypeName("NAME")
      .Group(GROUP)
      .Needs(gss);
  AddOption(app, "--client-keytab", options.clientKeytab,
            "Keytab to get a ticket with; the ticket is kept only when --ccache is given")
      .TypeName("FILE")
      .Group(GROUP)
      .Needs(gss);
}

} // namespace

void AddCredentialsOptions(CLI::App &app, CredentialsOptions &options) {
  const Option user =
      AddOption(app, "--user", options.user, "Acquire by password, for this user").TypeName("NAME").Group(GROUP);
  for (const Option &source : AddSecretOptions(app, options.password, GROUP)) {
    source.Needs(user);
  }
  AddOption(app, "--token", options.tokenFile,
            "Acquire in exchange for this token (an XML file, or \"-\" for standard input); needs an identity")
      .TypeName("FILE")
      .Group(GROUP);
  AddGssOptions(app, options.gss);
}

void ClaimInput(const CredentialsOptions &options, InputClaims &claims) {
  ClaimInput(options.password, claims);
  claims.ClaimFile(options.tokenFile, "--token");
}

const CredentialsKind &ChooseCredentials(const CredentialsOptions &options, bool hasIdentity) {
  const CredentialsKind *chosen = nullptr;
  for (const CredentialsKind &kind : CHOSEN_KINDS) {
    if (!kind.isChosen(options)) {
      continue;
    }
    if (chosen) {
      throw UsageException(std::string(chosen->option) + " and " + kind.option + " exclude each other");
    }
    chosen = &kind;
  }
  if (!chosen && !hasIdentity) {
    ThrowNoneChosen();
  }
  return chosen ? *chosen : IDENTITY_ALONE;
}

} // namespace SsoClient::Tool
