// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CannedService`, a token service on loopback, over TLS, that checks nothing and answers each kind of request at
/// once.

#pragma once

#include "support/posting_server.h"
#include "support/scripted_server.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/ssl/ssl_context.h>

#include <functional>
#include <memory>
#include <string>

namespace Testing {

/// For tests with more requests, in total or at once, than a service that checks them could answer.
class CannedService {
public:
  /// @param beforeAnswer runs for each request, on a separate thread, before it is answered
  explicit CannedService(std::function<void()> beforeAnswer = [] {});

  /// The configuration for this service, with a holder-of-key identity. This object owns the TLS context.
  SsoClient::SecurityTokenServiceConfig GetConfig() const;

  /// How many connections the service has accepted.
  int CountConnections() const { return m_server.GetConnectionCount(); }
  /// How many of them it has not ended yet.
  std::size_t CountOpenConnections() const { return m_server.GetOpenCount(); }

private:
  void Serve(ServerConnection &peer) const;

  const std::function<void()> m_beforeAnswer;
  const std::string m_issued;
  const std::string m_renewed;
  const std::string m_valid;
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context;
  ScriptedServer m_server; // last: its scripts use the rest
};

/// A holder-of-key token of the identity in `CannedService::GetConfig`.
std::shared_ptr<const SsoClient::SamlToken> HeldToken();

} // namespace Testing
