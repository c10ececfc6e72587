// SPDX-License-Identifier: Apache-2.0
/// @file
/// Getting a token from the file of --cache, or, if it has no fresh one, from the service.

#pragma once

#include "service_call.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/client/token_source.h>
#include <ssoclient/token_spec.h>

#include <functional>
#include <memory>

namespace SsoClient::Tool {

class IssueWatch;

/// What decides about the token.
struct CachedTokenCall {
  std::shared_ptr<const TokenClient> client;
  std::shared_ptr<const IssueWatch> watch; ///< the client's observer
  TokenSpec spec;
  TokenCacheOptions cache;
  std::function<Credential()> credential; ///< called on this thread, and only when the service must be asked
  std::function<bool(const SamlToken &token)> isAccepted; ///< whether a token of the file will do
};

/// The token; `askedAt` is set only if it was issued for this call.
/// @throws what `TokenSource::Get` throws. A signal and the limit of --timeout end the call.
IssuedToken GetCachedToken(const CachedTokenCall &call);

} // namespace SsoClient::Tool
