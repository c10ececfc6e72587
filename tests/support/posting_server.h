// SPDX-License-Identifier: Apache-2.0
/// @file
/// `PostingServer`, a token service on loopback that gives one answer after the other, over HTTP or HTTPS.

#pragma once

#include "support/data_file.h"
#include "support/scripted_server.h"

#include <ssoclient/security_token_service_config.h>
#include <tarvel/ssl/ssl_context.h>

#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace Testing {

class PostingServer {
public:
  explicit PostingServer(std::vector<std::string> answers, std::optional<TlsSettings> tls = std::nullopt)
      : m_answers(std::move(answers)), m_isSecure(tls), m_server([this](ServerConnection &peer) { Serve(peer); }, tls) {
  }

  std::string GetUrl() const {
    return std::string(m_isSecure ? "https" : "http") + "://localhost:" + std::to_string(m_server.GetPort()) + "/sts";
  }

  /// What the client has sent so far, header and body.
  std::vector<std::string> GetRequests() const {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_requests;
  }

private:
  void Serve(ServerConnection &peer) {
    if (m_isSecure && !peer.ShakeHands()) {
      return;
    }
    const std::string request = peer.ReadRequest();
    peer.Write("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\n" + Take(request));
  }

  std::string Take(const std::string &request) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    const std::string &answer = m_answers.at(m_requests.size());
    m_requests.push_back(request);
    return "Content-Length: " + std::to_string(answer.size()) + "\r\n\r\n" + answer;
  }

  const std::vector<std::string> m_answers;
  const bool m_isSecure;
  mutable std::mutex m_mutex;
  std::vector<std::string> m_requests;
  ScriptedServer m_server; // last: its scripts use the rest
};

/// A context that trusts the authority of tests/data/tls.
inline Tarvel::Ref<Tarvel::Ssl::SSLContext> ContextThatTrustsTheTestAuthority() {
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> context = Tarvel::Ssl::CreateSSLContext();
  context->TrustFile(TEST_DATA_DIR "/tls/authority.crt");
  return context;
}

/// How to reach `url`, and to trust what the fixture tokens are signed with.
inline SsoClient::SecurityTokenServiceConfig ConfigFor(const std::string &url) {
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.signingCertificates = {Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/sts-rsa.crt"))};
  return config;
}

} // namespace Testing
