// SPDX-License-Identifier: Apache-2.0
/// @file
/// `FaultService`, a token service on loopback with the fault that a test chooses, and what a client reports about it.

#pragma once

#include "support/scripted_server.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/security_token_service_config.h>
#include <tarvel/ssl/ssl_context.h>

#include <functional>
#include <memory>
#include <mutex>
#include <string>

namespace Testing {

class FaultService {
public:
  /// @param script of each connection until `Repair` is called; the script completes the handshake itself
  FaultService(ScriptedServer::Script script, bool isSecure);

  /// The configuration for this service. This object owns the TLS context.
  SsoClient::SecurityTokenServiceConfig GetConfig(const std::string &host = "localhost") const;

  std::unique_ptr<SsoClient::TokenClient> CreateClient(const SsoClient::ClientOptions &options = {}) const {
    return std::make_unique<SsoClient::TokenClient>(GetConfig(), options);
  }

  /// From now on, each request is answered with a token.
  void Repair();

  const ScriptedServer &GetServer() const noexcept { return m_server; }

private:
  void Serve(ServerConnection &peer);

  const bool m_isSecure;
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context;
  std::mutex m_mutex;
  ScriptedServer::Script m_script; // guarded by the mutex
  ScriptedServer m_server;         // last: its scripts use the rest
};

/// A response with this body.
std::string HttpResponse(const std::string &status, const std::string &body, const std::string &fields = "");

/// The response that contains a bearer token.
const std::string &TokenResponse();

/// A script that completes the handshake, reads the request and writes these bytes.
ScriptedServer::Script Reply(std::string bytes);

SsoClient::Credential AnyCredential();
SsoClient::TokenSpec AnySpec();

/// Class and text of an exception, such as "CancelledException: The operation was cancelled".
std::string Describe(const std::exception_ptr &failure);

/// "token" if `acquire` returns a token, "null" if it returns null, or what `Describe` returns for its exception.
std::string OutcomeOf(const std::function<std::shared_ptr<const SsoClient::SamlToken>()> &acquire);

constexpr const char *CANCELLED = "CancelledException: The operation was cancelled";
constexpr const char *CLIENT_DESTROYED =
    "CancelledException: The operation was cancelled because its client was destroyed";
constexpr const char *LATE = "DeadlineExceededException: The deadline passed before the operation ended";

} // namespace Testing
