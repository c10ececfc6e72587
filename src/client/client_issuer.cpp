// SPDX-License-Identifier: Apache-2.0

#include "client/client_issuer.h"

#include "client/client_operation.h"
#include "client/token_outcome.h"
#include "operation/required_object.h"

#include <utility>

namespace SsoClient {

ClientIssuer::ClientIssuer(std::shared_ptr<const TokenClient> client) : m_client(std::move(client)) {
  CheckRequired(m_client != nullptr);
}

void ClientIssuer::Acquire(const Credential &credential, const TokenSpec &spec, const CallOptions &options,
                           TokenCallback callback) const {
  ClientOperation::Completion completion = CompletionOf(std::move(callback)); // before the operation reports its start
  std::make_shared<ClientOperation>(m_client->m_core, Acquisition{credential, spec}, options)
      ->Start(std::move(completion), true);
}

void ClientIssuer::Renew(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec,
                         const CallOptions &options, TokenCallback callback) const {
  ClientOperation::Completion completion = CompletionOf(std::move(callback)); // before the operation reports its start
  std::make_shared<ClientOperation>(m_client->m_core, Renewal{token, lifetimeSec}, options)
      ->Start(std::move(completion), true);
}

const ClientCore &ClientIssuer::GetCore() const noexcept {
  return *m_client->m_core;
}

} // namespace SsoClient
