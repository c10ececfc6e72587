// SPDX-License-Identifier: Apache-2.0
/// @file
/// One POST of 4 KB over loopback TLS, with a new connection each, beside libcurl with the same settings against the same
/// server: with full handshakes, and with resumed ones. Wall time, as the caller waits it out; the server runs in this
/// process and its share is in both figures.

#include "median_reporter.h"

#include "support/scripted_server.h"
#include "transport/https_client.h"

#include <benchmark/benchmark.h>
#include <curl/curl.h>

#include <cstdlib>
#include <exception>
#include <fstream>
#include <iostream>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace Bench {

namespace {

using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsSettings;

const std::string AUTHORITY_FILE = TEST_DATA_DIR "/tls/authority.crt";
const std::string BODY(4096, 'x');
constexpr long TIMEOUT_SECONDS = 240;
constexpr char FULL = 'f';
constexpr char RESUMED = 'r';

/// Answers with 4 KB that begin with how the handshake went.
void Answer(ServerConnection &connection) {
  if (connection.ShakeHands()) {
    connection.ReadRequest();
    std::string body = BODY;
    body.front() = connection.WasResumed() ? RESUMED : FULL;
    connection.Write("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: 4096\r\nConnection: close\r\n\r\n" +
                     body);
  }
}

class Service {
public:
  explicit Service(bool resumes) : m_server(Answer, Settings(resumes)) {}

  std::string GetUrl() const { return "https://localhost:" + std::to_string(m_server.GetPort()) + "/STS/trust"; }

private:
  static TlsSettings Settings(bool resumes) {
    TlsSettings settings;
    settings.resumesSessions = resumes;
    return settings;
  }

  ScriptedServer m_server;
};

const std::string &GetUrl(bool resumes) {
  static const Service full(false);
  static const Service resumed(true);
  static const std::string urls[] = {full.GetUrl(), resumed.GetUrl()};
  return urls[resumes ? 1 : 0];
}

class OurClient {
public:
  explicit OurClient(const std::string &url) : m_client(url, TrustingContext(), "", TIMEOUT_SECONDS * 1000000) {
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
    context->TrustFile(AUTHORITY_FILE);
    return context;
  }

  const SsoClient::HttpsClient m_client;
  SsoClient::Request m_request;
};

/// libcurl as a host that knows it well would use it: one handle for all requests, which keeps the parsed authorities and
/// the sessions.
class CurlClient {
public:
  explicit CurlClient(const std::string &url) {
    Set(CURLOPT_URL, url.c_str());
    Set(CURLOPT_CAINFO, AUTHORITY_FILE.c_str());
    Set(CURLOPT_CAPATH, static_cast<const char *>(nullptr));
    Set(CURLOPT_TIMEOUT, TIMEOUT_SECONDS);
    Set(CURLOPT_NOSIGNAL, 1L);
    Set(CURLOPT_FRESH_CONNECT, 1L);
    Set(CURLOPT_FORBID_REUSE, 1L);
    Set(CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
    Set(CURLOPT_POSTFIELDS, BODY.c_str());
    Set(CURLOPT_POSTFIELDSIZE, static_cast<long>(BODY.size()));
    for (const char *header : {"Content-Type: text/xml", "SOAPAction: \"http://docs.oasis-open.org/\"",
                               "User-Agent: tarvel", "Accept:", "Connection: close", "Expect:"}) {
      m_headers.reset(curl_slist_append(m_headers.release(), header));
    }
    Set(CURLOPT_HTTPHEADER, m_headers.get());
    Set(CURLOPT_WRITEFUNCTION, &CurlClient::Append);
    Set(CURLOPT_WRITEDATA, &m_response);
  }

  std::string Post() {
    m_response.clear();
    if (const CURLcode code = curl_easy_perform(m_handle.get()); code != CURLE_OK) {
      throw std::runtime_error(curl_easy_strerror(code));
    }
    return m_response;
  }

private:
  template <typename T>
  void Set(CURLoption option, T value) {
    if (!m_handle || curl_easy_setopt(m_handle.get(), option, value) != CURLE_OK) {
      throw std::runtime_error("libcurl does not take an option");
    }
  }

  static std::size_t Append(const char *bytes, std::size_t size, std::size_t count, void *response) {
    static_cast<std::string *>(response)->append(bytes, size * count);
    return size * count;
  }

  std::unique_ptr<CURL, void (*)(CURL *)> m_handle{curl_easy_init(), &curl_easy_cleanup};
  std::unique_ptr<curl_slist, void (*)(curl_slist *)> m_headers{nullptr, &curl_slist_free_all};
  std::string m_response;
};

template <typename Client>
void Post(benchmark::State &state, bool resumes) {
  Client client(GetUrl(resumes));
  client.Post(); // after which there is a session to resume
  const char expected = resumes ? RESUMED : FULL;
  for (auto _ : state) {
    const std::string response = client.Post();
    if (response.size() != BODY.size() || response.front() != expected) {
      state.SkipWithError("not the response that was asked for");
      return;
    }
  }
}

void RegisterBenchmarks() {
  const auto add = [](const char *name, auto function, bool resumes) {
    return benchmark::RegisterBenchmark(name, function, resumes)->Unit(benchmark::kMicrosecond)->UseRealTime();
  };
  add("ours/full", Post<OurClient>, false);
  add("libcurl/full", Post<CurlClient>, false);
  add("ours/resumed", Post<OurClient>, true);
  add("libcurl/resumed", Post<CurlClient>, true);
}

/// The members of one comparison.
void WriteComparison(const Medians &medians, const std::string &handshake, std::ostream &out) {
  const double ours = medians.at("ours/" + handshake + "/real_time").wallUs;
  const double libcurl = medians.at("libcurl/" + handshake + "/real_time").wallUs;
  out << "\"ours_us\": " << ours << ", \"ratio\": " << ours / libcurl << ", \"peers\": {\"libcurl\": " << libcurl
      << "}";
}

// One object, its members on lines of their own between the braces'. Times are microseconds of wall time; the ratio is to
// libcurl, as nobody knows the limit of the system's network.
void WriteSummary(const Medians &medians, std::ostream &out) {
  out << "{\n\"transport\": {";
  WriteComparison(medians, "full", out);
  out << ",\n  \"resumed\": {";
  WriteComparison(medians, "resumed", out);
  out << "}}\n}\n";
}

void Main(std::vector<std::string> arguments) {
  const std::string json = TakeOption(arguments, "--json");
  if (curl_global_init(CURL_GLOBAL_DEFAULT) != CURLE_OK) {
    throw std::runtime_error("libcurl does not start");
  }
  RegisterBenchmarks();
  const Medians medians = RunInterleaved(arguments);
  if (json.empty()) {
    WriteSummary(medians, std::cout);
    return;
  }
  std::ofstream file(json);
  WriteSummary(medians, file);
  if (!file.flush()) {
    throw std::runtime_error("cannot write " + json);
  }
}

} // namespace

} // namespace Bench

int main(int argc, char **argv) {
  try {
    Bench::Main({argv + 1, argv + argc});
    return EXIT_SUCCESS;
  } catch (const std::exception &error) {
    std::cerr << "transport: " << error.what() << '\n';
    return EXIT_FAILURE;
  }
}
