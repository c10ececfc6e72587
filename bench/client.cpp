// SPDX-License-Identifier: Apache-2.0
/// @file
/// Measures `TokenClient` and `TokenSource`: the threads and memory of many acquisitions under way at once; their
/// throughput, compared with libcurl's multi interface and one check of each token; how soon a cancelled or late
/// acquisition ends; and how long a call takes that returns a fresh token. The service is a process of its own.
/// bench/service.cpp measures a single acquisition.

#include "crowd.h"
#include "curl_crowd.h"
#include "end_times.h"
#include "fresh_get.h"
#include "median.h"

#include "exchange/request_builder_impl.h"
#include "support/held_server.h"
#include "support/resident_memory.h"

#include <ssoclient/client/token_source.h>
#include <ssoclient/create_saml_token.h>

#include <benchmark/benchmark.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <fstream>
#include <iostream>
#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

namespace Bench {

namespace {

using Testing::HeldServer;
using Kind = HeldServer::Kind;

constexpr std::chrono::milliseconds SERVICE_TIME{100};
constexpr unsigned long SPARE_DESCRIPTORS = 100;

/// How many acquisitions are started at once, and in how many rounds.
struct CrowdSize {
  std::size_t operations;
  int rounds;
};

struct Settings {
  std::size_t underWay = 10'000;
  std::vector<CrowdSize> crowds{{1'000, 9}, {10'000, 3}};
  std::size_t cancels = 200;
  std::size_t cancelsAmong = 1'000;
  int getRounds = 15;
  int getCalls = 200'000;
  std::string json;
};

/// The memory and threads of acquisitions while all of them wait for the service.
struct UnderWay {
  std::size_t operations = 0;
  double kilobytesEach = 0;
  std::size_t threads = 0;
};

struct Throughput {
  std::size_t operations = 0;
  double oursPerSecond = 0;
  double libcurlPerSecond = 0;
  double share = 0; ///< ours, divided by libcurl's
};

struct Figures {
  UnderWay http;
  UnderWay tls;
  std::vector<Throughput> httpCrowds;
  std::vector<Throughput> tlsCrowds;
  EndTimes cancelOne;
  EndTimes cancelAmong;
  EndTimes deadline;
  GetTimes getOnOne;
  GetTimes getOnMany;
};

constexpr int MANY_THREADS = 16;

UnderWay MeasureUnderWay(Kind kind, std::size_t operations) {
  HeldServer server(GetIssueResponse(), kind);
  Crowd crowd(ConnectTo(server));
  crowd.Start(1); // the library's first use
  crowd.WaitForTokens();
  server.Hold();
  const double before = Testing::ResidentKilobytes();
  crowd.Start(operations);
  WaitForRequests(server, 1 + static_cast<int>(operations));
  const UnderWay figures{operations, (Testing::ResidentKilobytes() - before) / static_cast<double>(operations),
                         Testing::CountThreadsOfLibrary()};
  server.Release();
  crowd.WaitForTokens();
  return figures;
}

double PerSecond(std::size_t operations, std::chrono::steady_clock::time_point begun) {
  const std::chrono::duration<double> time = std::chrono::steady_clock::now() - begun;
  return static_cast<double>(operations) / time.count();
}

double RunOurs(Crowd &crowd, std::size_t operations) {
  const auto begun = std::chrono::steady_clock::now();
  crowd.Start(operations);
  crowd.WaitForTokens();
  return PerSecond(operations, begun);
}

double RunLibcurl(CurlCrowd &crowd, std::size_t operations) {
  const auto begun = std::chrono::steady_clock::now();
  crowd.PostAll([](const std::string &body) {
    if (body != GetIssueResponse()) {
      throw std::runtime_error("libcurl has another response");
    }
    benchmark::DoNotOptimize(SsoClient::CreateSamlToken(GetIssuedTokenXml(), GetTrustedCertificates()));
  });
  return PerSecond(operations, begun);
}

Throughput MeasureThroughput(Kind kind, std::size_t operations, int rounds) {
  HeldServer server(GetIssueResponse(), kind);
  Crowd ours(ConnectTo(server));
  SsoClient::Request request;
  SsoClient::RequestBuilderImpl(boost::none)
      .BuildUserPassTokenRequest(CROWD_USER, CROWD_PASSWORD, GetCrowdSpec(), request);
  CurlCrowd libcurl(server.GetUrl(), TEST_DATA_DIR "/tls/authority.crt", SsoClient::Request::ISSUE, request.body,
                    operations);
  ours.Start(1);
  ours.WaitForTokens();
  server.DelayAnswers(SERVICE_TIME);
  std::vector<double> oursPerSecond;
  std::vector<double> libcurlPerSecond;
  std::vector<double> shares;
  for (int round = 0; round < rounds; ++round) {
    oursPerSecond.push_back(RunOurs(ours, operations));
    libcurlPerSecond.push_back(RunLibcurl(libcurl, operations));
    shares.push_back(oursPerSecond.back() / libcurlPerSecond.back());
  }
  return {operations, MedianOf(oursPerSecond), MedianOf(libcurlPerSecond), MedianOf(shares)};
}

std::vector<Throughput> MeasureCrowds(Kind kind, const Settings &settings) {
  std::vector<Throughput> crowds;
  for (const auto &[operations, rounds] : settings.crowds) {
    crowds.push_back(MeasureThroughput(kind, operations, rounds));
    std::printf("%6zu at once over %s: %.0f a second, libcurl %.0f, share %.2f\n", operations,
                kind == Kind::HTTP ? "http" : "TLS", crowds.back().oursPerSecond, crowds.back().libcurlPerSecond,
                crowds.back().share);
  }
  return crowds;
}

void MeasureEnds(const Settings &settings, Figures &figures) {
  HeldServer server(GetIssueResponse(), Kind::TLS);
  server.Hold();
  figures.cancelOne = MeasureCancel(server, 1, settings.cancels);
  figures.cancelAmong = MeasureCancel(server, settings.cancelsAmong, settings.cancels);
  figures.deadline = MeasureDeadline(server, settings.cancelsAmong);
}

void MeasureGets(const Settings &settings, Figures &figures) {
  const HeldServer server(GetIssueResponse(), Kind::TLS);
  const SsoClient::TokenSource source(
      ConnectTo(server),
      [] {
        return SsoClient::PasswordCredential{CROWD_USER, Tarvel::SecretText(std::string(CROWD_PASSWORD))};
      },
      GetCrowdSpec());
  figures.getOnOne = MeasureGet(source, 1, settings.getRounds, settings.getCalls);
  figures.getOnMany = MeasureGet(source, MANY_THREADS, settings.getRounds, settings.getCalls / 4);
}

void Print(const char *what, const UnderWay &figures) {
  std::printf("%6zu under way over %s: %.1f KB each, %zu threads\n", figures.operations, what, figures.kilobytesEach,
              figures.threads);
}

void Print(const char *what, const EndTimes &times) {
  std::printf("%s: %.2f ms, at worst %.2f ms\n", what, times.median, times.worst);
}

void Print(const char *what, const GetTimes &times) {
  std::printf("Get on %s: %.1f ns, atomic shared_ptr %.1f ns, mutex %.1f ns, ratio %.2f\n", what, times.source,
              times.atomicSharedPtr, times.mutexSharedPtr, times.ratio);
}

// Memory is measured first, before the process keeps memory of other measurements.
Figures MeasureAll(const Settings &settings) {
  Figures figures;
  figures.http = MeasureUnderWay(Kind::HTTP, settings.underWay);
  Print("http", figures.http);
  figures.tls = MeasureUnderWay(Kind::TLS, settings.underWay);
  Print("TLS", figures.tls);
  MeasureEnds(settings, figures);
  Print("a cancelled acquisition, the only one, ends after", figures.cancelOne);
  Print("a cancelled acquisition, one of many, ends after", figures.cancelAmong);
  Print("a late acquisition ends after its deadline by", figures.deadline);
  MeasureGets(settings, figures);
  Print("one thread", figures.getOnOne);
  Print("many threads", figures.getOnMany);
  figures.httpCrowds = MeasureCrowds(Kind::HTTP, settings);
  figures.tlsCrowds = MeasureCrowds(Kind::TLS_WITHOUT_SESSIONS, settings);
  return figures;
}

void Write(const char *name, const UnderWay &figures, std::ostream &out) {
  out << "\"" << name << "\": {\"operations\": " << figures.operations << ", \"kb_each\": " << figures.kilobytesEach
      << ", \"threads\": " << figures.threads << "}";
}

void Write(const char *name, const std::vector<Throughput> &crowds, std::ostream &out) {
  out << "\"" << name << "\": [";
  const char *separator = "";
  for (const Throughput &crowd : crowds) {
    out << separator << "{\"operations\": " << crowd.operations << ", \"ours_per_second\": " << crowd.oursPerSecond
        << ", \"libcurl_per_second\": " << crowd.libcurlPerSecond << ", \"share\": " << crowd.share << "}";
    separator = ",\n      ";
  }
  out << "]";
}

void Write(const char *name, const EndTimes &times, std::ostream &out) {
  out << "\"" << name << "\": {\"median_ms\": " << times.median << ", \"worst_ms\": " << times.worst << "}";
}

void Write(const char *name, const GetTimes &times, std::ostream &out) {
  out << "\"" << name << "\": {\"ours_ns\": " << times.source << ", \"atomic_shared_ptr_ns\": " << times.atomicSharedPtr
      << ", \"mutex_shared_ptr_ns\": " << times.mutexSharedPtr << ", \"ratio\": " << times.ratio << "}";
}

void WriteSummary(const Figures &figures, std::ostream &out) {
  out << "{\n\"client\": {\"ratio\": " << 1 / figures.httpCrowds.front().share << ",\n  \"under_way\": {";
  Write("http", figures.http, out);
  out << ",\n    ";
  Write("tls", figures.tls, out);
  out << "},\n  \"throughput\": {";
  Write("http", figures.httpCrowds, out);
  out << ",\n    ";
  Write("tls", figures.tlsCrowds, out);
  out << "},\n  \"end\": {";
  Write("cancel_one", figures.cancelOne, out);
  out << ",\n    ";
  Write("cancel_among_many", figures.cancelAmong, out);
  out << ",\n    ";
  Write("deadline", figures.deadline, out);
  out << "},\n  \"fresh_get\": {";
  Write("threads_1", figures.getOnOne, out);
  out << ",\n    ";
  Write("threads_16", figures.getOnMany, out);
  out << "}}\n}\n";
}

Settings ReadArguments(const std::vector<std::string> &arguments) {
  Settings settings;
  for (std::size_t i = 0; i < arguments.size(); ++i) {
    if (arguments[i] == "--quick") {
      settings.underWay = 1'000;
      settings.crowds = {{300, 3}};
      settings.cancels = 30;
      settings.cancelsAmong = 200;
      settings.getRounds = 5;
      settings.getCalls = 50'000;
    } else if (arguments[i] == "--json" && i + 1 < arguments.size()) {
      settings.json = arguments[++i];
    } else {
      throw std::runtime_error("usage: client [--json FILE] [--quick]");
    }
  }
  return settings;
}

void Run(const std::vector<std::string> &arguments) {
  const Settings settings = ReadArguments(arguments);
  if (!Testing::AllowDescriptors(settings.underWay + SPARE_DESCRIPTORS)) {
    throw std::runtime_error("the system does not allow a process " + std::to_string(settings.underWay) +
                             " connections");
  }
  const Figures figures = MeasureAll(settings);
  if (settings.json.empty()) {
    WriteSummary(figures, std::cout);
    return;
  }
  std::ofstream file(settings.json);
  WriteSummary(figures, file);
  if (!file.flush()) {
    throw std::runtime_error("cannot write " + settings.json);
  }
}

} // namespace

} // namespace Bench

int main(int argc, char **argv) {
  try {
    Bench::Run({argv + 1, argv + argc});
    return EXIT_SUCCESS;
  } catch (const std::exception &error) {
    std::cerr << "client: " << error.what() << '\n';
    return EXIT_FAILURE;
  }
}
