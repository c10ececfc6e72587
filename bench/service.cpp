// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares acquiring a token by password over loopback TLS with the work that cannot be avoided: the exchange of the
/// same bytes, by libcurl, and one check of the token. The limit is the sum of the two; both in one loop are measured
/// as well. Each exchange has a new connection, with a full handshake or a resumed one. The times are wall times, which
/// a caller waits for; the server runs in this process, and all figures include its work. The same is measured for the
/// call of `TokenClient` that waits. The last figures are the tokens that one service acquires in a second for several
/// threads.

#include "canned_server.h"
#include "curl_client.h"
#include "program.h"

#include "exchange/request_builder_impl.h"
#include "support/soap_responses.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/create_saml_token.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/ssl/ssl_context.h>

#include <benchmark/benchmark.h>

#include <memory>
#include <ostream>
#include <string>

namespace Bench {

namespace {

const std::string USER = "alice@corp.example";
const std::string PASSWORD = "wonderland";
constexpr int THREAD_COUNTS[] = {1, 2, 4, 8, 16};

SsoClient::TokenSpec Spec() {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return spec;
}

const std::string &GetTokenXml() {
  static const std::string xml = ReadFile(TEST_DATA_DIR "/tokens/bearer-5k.xml"); // valid for a century
  return xml;
}

const Tarvel::Crypto::CertificateList &GetTrusted() {
  static const auto trusted = Tarvel::Crypto::LoadCertificates(TEST_DATA_DIR "/tokens/sts-rsa.crt");
  return trusted;
}

const std::string &GetResponse() {
  static const std::string response = Testing::IssueResponse(GetTokenXml());
  return response;
}

const CannedServer &GetServer(bool resumes) {
  static const CannedServer full(GetResponse(), false);
  static const CannedServer resumed(GetResponse(), true);
  return resumes ? resumed : full;
}

SsoClient::SecurityTokenServiceConfig ConfigFor(const std::string &url, Tarvel::Ssl::SSLContext &context) {
  context.TrustFile(CannedServer::AUTHORITY_FILE);
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.signingCertificates = GetTrusted();
  config.sslContext = &context;
  return config;
}

/// A service as a host would create it, with its own TLS context.
class Service {
public:
  explicit Service(const std::string &url)
      : m_service(SsoClient::CreateSecurityTokenService(ConfigFor(url, *m_context))) {}

  std::shared_ptr<const SsoClient::SamlToken> Acquire() const {
    return m_service->AcquireToken(USER, PASSWORD, m_spec);
  }

private:
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context = Tarvel::Ssl::CreateSSLContext();
  const SsoClient::TokenSpec m_spec = Spec();
  const std::shared_ptr<const SsoClient::SecurityTokenService> m_service;
};

/// The same with a `TokenClient`.
class Client {
public:
  explicit Client(const std::string &url) : m_client(ConfigFor(url, *m_context)) {}

  std::shared_ptr<const SsoClient::SamlToken> Acquire() const { return m_client.Acquire(m_credential, m_spec); }

private:
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context = Tarvel::Ssl::CreateSSLContext();
  const SsoClient::TokenSpec m_spec = Spec();
  const SsoClient::Credential m_credential =
      SsoClient::PasswordCredential{USER, Tarvel::SecretText(std::string(PASSWORD))};
  const SsoClient::TokenClient m_client;
};

/// Posts the same request as the service.
class Libcurl : public CurlClient {
public:
  explicit Libcurl(const std::string &url)
      : CurlClient(url, CannedServer::AUTHORITY_FILE, SsoClient::Request::ISSUE, RequestBody()) {}

private:
  static std::string RequestBody() {
    SsoClient::Request request;
    SsoClient::RequestBuilderImpl(boost::none).BuildUserPassTokenRequest(USER, PASSWORD, Spec(), request);
    return request.body;
  }
};

/// Fails the benchmark when a measured handshake is not of the kind that the server was made for.
class HandshakeCheck {
public:
  HandshakeCheck(benchmark::State &state, const CannedServer &server)
      : m_state(state), m_server(server), m_before(server.CountOtherHandshakes()) {}
  HandshakeCheck(const HandshakeCheck &) = delete;
  HandshakeCheck &operator=(const HandshakeCheck &) = delete;
  ~HandshakeCheck() {
    if (m_server.CountOtherHandshakes() != m_before) {
      m_state.SkipWithError("a handshake was of the wrong kind");
    }
  }

private:
  benchmark::State &m_state;
  const CannedServer &m_server;
  const int m_before;
};

template <typename ServiceOrClient>
void Acquire(benchmark::State &state, bool resumes) {
  const ServiceOrClient service(GetServer(resumes).GetUrl());
  service.Acquire(); // afterwards there is a session to resume
  const HandshakeCheck check(state, GetServer(resumes));
  for (auto _ : state) {
    benchmark::DoNotOptimize(service.Acquire());
  }
}

void Exchange(benchmark::State &state, bool resumes) {
  Libcurl client(GetServer(resumes).GetUrl());
  client.Post();
  const HandshakeCheck check(state, GetServer(resumes));
  for (auto _ : state) {
    if (client.Post() != GetResponse()) {
      state.SkipWithError("the response is wrong");
      return;
    }
  }
}

/// The limit's two parts in one loop. This takes longer than the sum of the two measured separately: each time, the
/// exchange has replaced the content of the processor's caches before the check, as it does in our operation.
void ExchangeAndVerify(benchmark::State &state, bool resumes) {
  Libcurl client(GetServer(resumes).GetUrl());
  client.Post();
  const HandshakeCheck check(state, GetServer(resumes));
  for (auto _ : state) {
    benchmark::DoNotOptimize(client.Post().data());
    benchmark::DoNotOptimize(SsoClient::CreateSamlToken(GetTokenXml(), GetTrusted()));
  }
}

void Verify(benchmark::State &state) {
  for (auto _ : state) {
    benchmark::DoNotOptimize(SsoClient::CreateSamlToken(GetTokenXml(), GetTrusted()));
  }
}

/// One service for all threads, which resume one another's sessions.
void AcquireOnThreads(benchmark::State &state) {
  static const Service service(GetServer(true).GetUrl());
  for (auto _ : state) {
    benchmark::DoNotOptimize(service.Acquire());
  }
}

void RegisterBenchmarks() {
  const auto add = [](const char *name, auto function, auto... arguments) {
    return benchmark::RegisterBenchmark(name, function, arguments...)->Unit(benchmark::kMicrosecond)->UseRealTime();
  };
  add("AcquireToken/full", Acquire<Service>, false);
  add("TokenClient/full", Acquire<Client>, false);
  add("libcurl/full", Exchange, false);
  add("AcquireToken/resumed", Acquire<Service>, true);
  add("TokenClient/resumed", Acquire<Client>, true);
  add("libcurl/resumed", Exchange, true);
  add("CreateSamlToken", Verify);
  add("both/full", ExchangeAndVerify, false);
  add("both/resumed", ExchangeAndVerify, true);
  for (const int threads : THREAD_COUNTS) {
    add("AcquireToken/shared", AcquireOnThreads)->Threads(threads);
  }
}

/// Writes the members of one comparison.
void WriteComparison(const Medians &medians, const std::string &handshake, std::ostream &out) {
  const double ours = medians.at("AcquireToken/" + handshake + "/real_time").wallUs;
  const double libcurl = medians.at("libcurl/" + handshake + "/real_time").wallUs;
  const double verification = medians.at("CreateSamlToken/real_time").wallUs;
  const double limit = libcurl + verification;
  const double inOneLoop = medians.at("both/" + handshake + "/real_time").wallUs;
  const double client = medians.at("TokenClient/" + handshake + "/real_time").wallUs;
  out << "\"ours_us\": " << ours << ", \"limit_us\": " << limit << ", \"ratio\": " << ours / limit
      << ", \"limit_parts\": {\"libcurl\": " << libcurl << ", \"verification\": " << verification
      << "},\n    \"limit_in_one_loop_us\": " << inOneLoop << ", \"ratio_in_one_loop\": " << ours / inOneLoop
      << ",\n    \"token_client\": {\"ours_us\": " << client << ", \"ratio\": " << client / ours
      << ", \"ratio_in_one_loop\": " << client / inOneLoop << "}";
}

// Times are microseconds of wall time.
void WriteSummary(const Medians &medians, std::ostream &out) {
  out << "{\n\"service\": {";
  WriteComparison(medians, "full", out);
  out << ",\n  \"resumed\": {";
  WriteComparison(medians, "resumed", out);
  out << "},\n  \"operations_per_second\": {";
  const char *separator = "";
  for (const int threads : THREAD_COUNTS) {
    const std::string name = "AcquireToken/shared/real_time/threads:" + std::to_string(threads);
    out << separator << "\"threads_" << threads << "\": " << 1e6 / medians.at(name).wallUs;
    separator = ", ";
  }
  out << "}}\n}\n";
}

} // namespace

constexpr Program PROGRAM{"service", RegisterBenchmarks, WriteSummary};

} // namespace Bench

int main(int argc, char **argv) {
  return Bench::RunProgram(Bench::PROGRAM, argc, argv);
}
