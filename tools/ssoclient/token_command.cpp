// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient token`: prints a fresh token, and asks the service for one only when the cache has none.

#include "cached_token.h"
#include "command.h"
#include "issue_watch.h"
#include "operation_events.h"
#include "option.h"
#include "token_request.h"

#include <boost/optional.hpp>

#include <memory>
#include <string>
#include <variant>

namespace SsoClient::Tool {
namespace {

struct TokenOptions {
  TokenRequestOptions request;
  std::string cacheFile;
  bool refresh = false;
};

void CheckCache(const TokenOptions &options) {
  if (options.cacheFile.empty()) {
    throw UsageException("token needs --cache FILE, in which it keeps the token; acquire gets a token without a cache");
  }
  const GssOptions &gss = options.request.credentials.gss;
  if (gss.isChosen && gss.client.empty()) {
    throw UsageException("with --cache, --gss needs --principal: the cache must know whose token it has");
  }
}

/// The owner of the token in the cache. Empty if the identity is the only credential. With an identity, the owner
/// contains its certificate, because a token that is bound to another key is another token.
std::string OwnerOf(const CredentialsOptions &credentials, const boost::optional<DoubtedCredential> &given,
                    const boost::optional<HolderOfKeyConfig> &identity) {
  std::string owner = credentials.user + credentials.gss.client;
  if (const auto *const exchanged = given ? std::get_if<TokenCredential>(&given->credential) : nullptr) {
    // Two tokens of one subject may differ in what they allow, and so do those that are issued for them.
    const PrincipalId &subject = exchanged->token->GetSubject();
    owner = "in exchange: " + subject.name + "@" + subject.domain + ", " + exchanged->token->GetId();
  }
  return identity && !owner.empty() ? owner + ", certificate:" + identity->certificate->GetSha256Thumbprint() : owner;
}

ExitCode PrintToken(const TokenOptions &options, const OutputOptions &output) {
  CheckCache(options);
  const auto watch = std::make_shared<IssueWatch>(ObserverFor(output));
  const TokenRequest request(options.request, output, watch);
  const CredentialsOptions &credentials = options.request.credentials;
  boost::optional<DoubtedCredential> given;
  if (credentials.user.empty()) {
    given = request.ReadCredential(); // a password is read only when it is needed
  }
  const Doubt *doubt = nullptr;
  const auto readCredential = [&] {
    const DoubtedCredential credential = given ? *given : request.ReadCredential();
    doubt = credential.doubt;
    WarnOf(doubt, output);
    return credential.credential;
  };
  const auto isAccepted = [&](const SamlToken &token) { return !options.refresh && request.IsAccepted(token); };
  const TokenCacheOptions cache{options.cacheFile, OwnerOf(credentials, given, request.GetIdentity())};
  request.Write([&] {
    return ExplainDoubt(
        [&] {
          return GetCachedToken({request.GetClient(), watch, request.GetSpec(), cache, readCredential, isAccepted});
        },
        doubt);
  });
  return ExitCode::DONE;
}

} // namespace

Action DefineToken(CLI::App &app, const OutputOptions &output) {
  const auto options = std::make_shared<TokenOptions>();
  AddOption(app, "--cache", options->cacheFile,
            "File that keeps the token, mode 0600; programs of one user that need the same token may share it")
      .TypeName("FILE");
  AddFlag(app, "--refresh", options->refresh,
          "Replace the token of the cache, for example because a service has refused it");
  AddTokenRequestOptions(app, options->request);
  return [options, &output] { return PrintToken(*options, output); };
}

} // namespace SsoClient::Tool
