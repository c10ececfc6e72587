// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenIssuer`, what a token source needs of a client. An interface, so that tests can replace the service.

#pragma once

#include <ssoclient/client/call_options.h>
#include <ssoclient/client/credential.h>
#include <ssoclient/client/outcome.h>
#include <ssoclient/token_spec.h>

#include <cstdint>
#include <memory>

namespace SsoClient {

/// Safe on any thread. Each call returns at once; its callback is called exactly once, later, on any thread.
class TokenIssuer {
public:
  virtual void Acquire(const Credential &credential, const TokenSpec &spec, const CallOptions &options,
                       TokenCallback callback) const = 0;
  virtual void Renew(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec,
                     const CallOptions &options, TokenCallback callback) const = 0;

protected:
  TokenIssuer() = default;
  TokenIssuer(const TokenIssuer &) = default;
  TokenIssuer &operator=(const TokenIssuer &) = default;
  ~TokenIssuer() = default;
};

} // namespace SsoClient
