// SPDX-License-Identifier: Apache-2.0
/// @file
/// `PostingServer`, a token service on loopback that sends given answers in order, over HTTP or HTTPS.

#pragma once

#include "support/scripted_server.h"

#include <ssoclient/security_token_service_config.h>
#include <tarvel/ssl/ssl_context.h>

#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace Testing {

class PostingServer {
public:
  explicit PostingServer(std::vector<std::string> answers, std::optional<TlsSettings> tls = std::nullopt);

  std::string GetUrl() const;

  /// The requests that the client has sent so far, header and body.
  std::vector<std::string> GetRequests() const;

private:
  void Serve(ServerConnection &peer);
  std::string Take(const std::string &request);

  const std::vector<std::string> m_answers;
  const bool m_isSecure;
  mutable std::mutex m_mutex;
  std::vector<std::string> m_requests;
  ScriptedServer m_server; // last: its scripts use the rest
};

/// A context that trusts the authority of tests/data/tls.
Tarvel::Ref<Tarvel::Ssl::SSLContext> ContextThatTrustsTheTestAuthority();

/// The configuration for a service at `url` that signs tokens with the key of the fixture tokens.
SsoClient::SecurityTokenServiceConfig ConfigFor(const std::string &url);

} // namespace Testing
