// SPDX-License-Identifier: Apache-2.0

#include "crowd.h"

#include "program.h"

#include "support/soap_responses.h"

#include <stdexcept>
#include <thread>
#include <utility>

namespace Bench {

namespace {

constexpr std::chrono::minutes PATIENCE{2};

} // namespace

const std::string CROWD_USER = "alice@corp.example";
const std::string CROWD_PASSWORD = "wonderland";

const std::string &GetIssuedTokenXml() {
  static const std::string xml = ReadFile(TEST_DATA_DIR "/tokens/bearer-5k.xml"); // valid for a century
  return xml;
}

const std::string &GetIssueResponse() {
  static const std::string response = Testing::IssueResponse(GetIssuedTokenXml());
  return response;
}

const Tarvel::Crypto::CertificateList &GetTrustedCertificates() {
  static const auto trusted = Tarvel::Crypto::LoadCertificates(TEST_DATA_DIR "/tokens/sts-rsa.crt");
  return trusted;
}

SsoClient::TokenSpec GetCrowdSpec() {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return spec;
}

std::shared_ptr<const SsoClient::TokenClient> ConnectTo(const Testing::HeldServer &server) {
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> context = Tarvel::Ssl::CreateSSLContext();
  context->TrustFile(TEST_DATA_DIR "/tls/authority.crt");
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = server.GetUrl();
  config.signingCertificates = GetTrustedCertificates();
  config.sslContext = context.get();
  return std::make_shared<const SsoClient::TokenClient>(config);
}

void Crowd::Start(std::size_t count, const SsoClient::CallOptions &options) {
  {
    const std::lock_guard<std::mutex> lock(m_outcomes->mutex);
    m_outcomes->pending += count;
  }
  const SsoClient::Credential credential =
      SsoClient::PasswordCredential{CROWD_USER, Tarvel::SecretText(std::string(CROWD_PASSWORD))};
  const SsoClient::TokenSpec spec = GetCrowdSpec();
  for (std::size_t i = 0; i < count; ++i) {
    m_client->AcquireAsync(credential, spec, options, [outcomes = m_outcomes](const SsoClient::TokenOutcome &outcome) {
      Note(*outcomes, outcome);
    });
  }
}

void Crowd::WaitForTokens() {
  std::unique_lock<std::mutex> lock(m_outcomes->mutex);
  if (!m_outcomes->changed.wait_for(lock, PATIENCE, [this] { return m_outcomes->pending == 0; })) {
    throw std::runtime_error(std::to_string(m_outcomes->pending) + " acquisitions have not ended");
  }
  if (!m_outcomes->wrong.empty()) {
    throw std::runtime_error("an acquisition failed: " + m_outcomes->wrong);
  }
}

void Crowd::Note(Outcomes &outcomes, const SsoClient::TokenOutcome &outcome) {
  std::string wrong;
  try {
    if (outcome.Get()->GetSubject().ToString() != "{Name: alice; Domain:corp.example}") {
      wrong = "another token";
    }
  } catch (const std::exception &failure) {
    wrong = failure.what();
  }
  const std::lock_guard<std::mutex> lock(outcomes.mutex);
  if (outcomes.wrong.empty()) {
    outcomes.wrong = std::move(wrong);
  }
  if (--outcomes.pending == 0) {
    outcomes.changed.notify_all();
  }
}

void WaitForRequests(const Testing::HeldServer &server, int count) {
  const auto end = std::chrono::steady_clock::now() + PATIENCE;
  while (server.CountRequests() < count) {
    if (std::chrono::steady_clock::now() > end) {
      throw std::runtime_error("only " + std::to_string(server.CountRequests()) + " requests have arrived");
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
}

} // namespace Bench
