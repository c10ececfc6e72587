// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ClientIssuer`, the `TokenIssuer` of a `TokenClient`.

#pragma once

#include "client/client_core.h"
#include "client/token_issuer.h"

#include <ssoclient/client/token_client.h>

#include <cstdint>
#include <memory>
#include <string>

namespace SsoClient {

/// Passes each call to the client, which it keeps. Callbacks run on the thread that ends the operation, without an
/// executor.
class ClientIssuer final : public TokenIssuer {
public:
  /// @throws Tarvel::InvalidArgumentException for null.
  explicit ClientIssuer(std::shared_ptr<const TokenClient> client);

  void Acquire(const Credential &credential, const TokenSpec &spec, const CallOptions &options,
               TokenCallback callback) const override;
  void Renew(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec, const CallOptions &options,
             TokenCallback callback) const override;

  /// Service, identity and options of the client, and its `Verify`.
  const ClientCore &GetCore() const noexcept;

private:
  std::shared_ptr<const TokenClient> m_client;
};

} // namespace SsoClient
