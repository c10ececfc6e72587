// SPDX-License-Identifier: Apache-2.0

#include "support/posting_server.h"

#include "support/data_file.h"

#include <utility>

namespace Testing {

PostingServer::PostingServer(std::vector<std::string> answers, std::optional<TlsSettings> tls)
    : m_answers(std::move(answers)), m_isSecure(tls), m_server([this](ServerConnection &peer) { Serve(peer); }, tls) {}

std::string PostingServer::GetUrl() const {
  return std::string(m_isSecure ? "https" : "http") + "://localhost:" + std::to_string(m_server.GetPort()) + "/sts";
}

std::vector<std::string> PostingServer::GetRequests() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_requests;
}

void PostingServer::Serve(ServerConnection &peer) {
  if (m_isSecure && !peer.Handshake()) {
    return;
  }
  const std::string request = peer.ReadRequest();
  peer.Write("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\n" + Take(request));
}

std::string PostingServer::Take(const std::string &request) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  const std::string &answer = m_answers.at(m_requests.size());
  m_requests.push_back(request);
  return "Content-Length: " + std::to_string(answer.size()) + "\r\n\r\n" + answer;
}

Tarvel::Ref<Tarvel::Ssl::SSLContext> ContextThatTrustsTheTestAuthority() {
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> context = Tarvel::Ssl::CreateSSLContext();
  context->TrustFile(DataPath("tls/authority.crt"));
  return context;
}

SsoClient::SecurityTokenServiceConfig ConfigFor(const std::string &url) {
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.signingCertificates = {Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/sts-rsa.crt"))};
  return config;
}

} // namespace Testing
