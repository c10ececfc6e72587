// SPDX-License-Identifier: Apache-2.0
/// @file
/// Gets a token from the file of --cache, or, if it has no fresh token, from the service.

#pragma once

#include "service_call.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/client/token_source.h>
#include <ssoclient/token_spec.h>

#include <functional>
#include <memory>

namespace SsoClient::Tool {

class IssueWatch;

/// What is needed to get the token.
struct CachedTokenCall {
  std::shared_ptr<const TokenClient> client;
  std::shared_ptr<const IssueWatch> watch; ///< the client's observer
  TokenSpec spec;
  TokenCacheOptions cache;
  std::function<Credential()> credential; ///< called on this thread, only to ask the service for a token
  std::function<bool(const SamlToken &token)> isAccepted; ///< whether a token of the file may be used
};

/// The token. `askedAt` is set only if the token was issued for this call.
/// @throws what `TokenSource::Get` throws. A signal and the limit of --timeout end the call.
IssuedToken GetCachedToken(const CachedTokenCall &call);

} // namespace SsoClient::Tool
