// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HeldService`, a token service in a process of its own, which delays some answers until the test allows them.

#pragma once

#include "integration/fork/server_process.h"
#include "support/data_file.h"
#include "support/forked.h"
#include "support/posting_server.h"
#include "support/process_resources.h"
#include "support/soap_responses.h"

#include <ssoclient/security_token_service_config.h>
#include <tarvel/ssl/ssl_context.h>

#include <atomic>
#include <optional>
#include <string>

namespace Testing {

/// Answers each request with a token. The answer to "slow@corp.example" waits until `Answer` is called.
class HeldService {
public:
  explicit HeldService(bool isSecure)
      : m_isSecure(isSecure), m_server([this](ServerConnection &peer) { Serve(peer); },
                                       isSecure ? std::optional(TlsSettings()) : std::nullopt),
        m_context(ContextThatTrustsTheTestAuthority()) {}

  SsoClient::SecurityTokenServiceConfig GetConfig() const {
    SsoClient::SecurityTokenServiceConfig config = ConfigFor(
        std::string(m_isSecure ? "https" : "http") + "://localhost:" + std::to_string(m_server.GetPort()) + "/sts");
    config.sslContext = m_context.get();
    return config;
  }
  int GetPort() const { return m_server.GetPort(); }

  /// Waits for `count` requests whose answers are delayed. Returns false if they do not arrive in time.
  bool WaitForHeld(int count) const {
    return Eventually([this, count] { return *m_held >= count; });
  }
  void Answer() const { *m_answers = true; }

private:
  void Serve(ServerConnection &peer) const {
    if (m_isSecure && !peer.Handshake()) {
      return;
    }
    if (peer.ReadRequest().find("slow@corp.example") != std::string::npos) {
      ++*m_held;
      Eventually([this] { return m_answers->load(); });
    }
    const std::string body = IssueResponse(ReadDataFile("tokens/bearer.xml"));
    peer.Write("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " + std::to_string(body.size()) +
               "\r\n\r\n" + body);
  }

  const bool m_isSecure;
  const Shared<std::atomic<int>> m_held;
  const Shared<std::atomic<bool>> m_answers;
  const ServerProcess m_server;
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context;
};

} // namespace Testing
