// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares a POST of 4 KB over loopback TLS, each over a new connection, with libcurl, which has the same settings and
/// the same server: with full handshakes, and with resumed ones. The times are wall times, which a caller waits for;
/// the server runs in this process, and both figures include its work.

#include "canned_server.h"
#include "curl_client.h"
#include "program.h"

#include "transport/https_client.h"

#include <benchmark/benchmark.h>

#include <ostream>
#include <string>

namespace Bench {

namespace {

const std::string BODY(4096, 'x');
constexpr std::int64_t TIMEOUT_MICROSECONDS = 240000000;

const CannedServer &GetServer(bool resumes) {
  static const CannedServer full(BODY, false);
  static const CannedServer resumed(BODY, true);
  return resumes ? resumed : full;
}

class OurClient {
public:
  explicit OurClient(const std::string &url) : m_client(url, TrustingContext(), "", TIMEOUT_MICROSECONDS) {
    m_request.soapAction = SsoClient::Request::ISSUE;
    m_request.body = BODY;
  }

  std::string Post() {
    Tarvel::Ref<Tarvel::Reader> response;
    m_client.CreateSession()->SendRequest(m_request, response);
    return response->ReadToEnd(BODY.size());
  }

private:
  static Tarvel::Ref<Tarvel::Ssl::SSLContext> TrustingContext() {
    const Tarvel::Ref<Tarvel::Ssl::SSLContext> context = Tarvel::Ssl::CreateSSLContext();
    context->TrustFile(CannedServer::AUTHORITY_FILE);
    return context;
  }

  const SsoClient::HttpsClient m_client;
  SsoClient::Request m_request;
};

class Libcurl : public CurlClient {
public:
  explicit Libcurl(const std::string &url)
      : CurlClient(url, CannedServer::AUTHORITY_FILE, SsoClient::Request::ISSUE, BODY) {}
};

template <typename Client>
void Post(benchmark::State &state, bool resumes) {
  const CannedServer &server = GetServer(resumes);
  Client client(server.GetUrl());
  client.Post(); // afterwards there is a session to resume
  const int otherHandshakes = server.CountOtherHandshakes();
  for (auto _ : state) {
    if (client.Post() != BODY) {
      state.SkipWithError("the response is wrong");
      return;
    }
  }
  if (server.CountOtherHandshakes() != otherHandshakes) {
    state.SkipWithError("a handshake was of the wrong kind");
  }
}

void RegisterBenchmarks() {
  const auto add = [](const char *name, auto function, bool resumes) {
    return benchmark::RegisterBenchmark(name, function, resumes)->Unit(benchmark::kMicrosecond)->UseRealTime();
  };
  add("ours/full", Post<OurClient>, false);
  add("libcurl/full", Post<Libcurl>, false);
  add("ours/resumed", Post<OurClient>, true);
  add("libcurl/resumed", Post<Libcurl>, true);
}

/// Writes the members of one comparison.
void WriteComparison(const Medians &medians, const std::string &handshake, std::ostream &out) {
  const double ours = medians.at("ours/" + handshake + "/real_time").wallUs;
  const double libcurl = medians.at("libcurl/" + handshake + "/real_time").wallUs;
  out << "\"ours_us\": " << ours << ", \"ratio\": " << ours / libcurl << ", \"peers\": {\"libcurl\": " << libcurl
      << "}";
}

// Times are microseconds of wall time; the ratio is to libcurl, because the limit of the system's network is not known.
void WriteSummary(const Medians &medians, std::ostream &out) {
  out << "{\n\"transport\": {";
  WriteComparison(medians, "full", out);
  out << ",\n  \"resumed\": {";
  WriteComparison(medians, "resumed", out);
  out << "}}\n}\n";
}

} // namespace

constexpr Program PROGRAM{"transport", RegisterBenchmarks, WriteSummary};

} // namespace Bench

int main(int argc, char **argv) {
  return Bench::RunProgram(Bench::PROGRAM, argc, argv);
}
