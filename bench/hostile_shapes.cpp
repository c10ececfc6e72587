// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares the cost of hostile documents, until `CreateSamlToken` refuses or accepts them, with the cost of a genuine
/// token of 5 MB. Does the same for `TokenVerifier::Explain`, the report on the document. All costs are for each octet.
///
/// In the JSON, the figures of reports are under the key "report", with the same keys as those of verifications.

#include "counted_heap.h"
#include "hostile_documents.h"
#include "program.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/token_verifier.h>

#include <malloc.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <exception>
#include <fstream>
#include <functional>
#include <iostream>
#include <limits>
#include <ostream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace Bench {

namespace {

constexpr std::size_t KIB = 1024;
constexpr std::size_t MIB = 1024 * KIB;

/// A document that takes longer is read only once, and its shape is not tried in the next size: its growth is known
/// already.
constexpr double TOO_LONG_SECONDS = 2;

constexpr std::size_t OUTCOME_LENGTH = 90; // how much of a refusal a line shows

struct Settings {
  std::array<std::size_t, 3> sizes{1 * MIB, 4 * MIB, 16 * MIB};
  int rounds = 3; // the fastest counts
  std::string json;
};

struct Cost {
  double nanosecondsPerOctet = 0;
  std::size_t heapOctets = 0; // the peak, without the text
  std::string refusal;        // empty when it is accepted, because some inserted content need not be signed
};

double CpuSeconds() {
  std::timespec now{};
  ::clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &now);
  return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

/// What is measured: reads a text, and returns why it is refused. An empty text means that it is accepted.
using Reading = std::function<std::string(const std::string &xml)>;

Reading Verifying(const Tarvel::Crypto::CertificateList &trusted) {
  return [trusted](const std::string &xml) {
    try {
      SsoClient::CreateSamlToken(xml, trusted);
      return std::string();
    } catch (const std::exception &error) {
      return std::string(error.what());
    }
  };
}

Reading Explaining(const Tarvel::Crypto::CertificateList &trusted) {
  return
      [verifier = SsoClient::TokenVerifier(trusted)](const std::string &xml) { return verifier.Explain(xml).refusal; };
}

Cost MeasureOnce(const std::string &xml, const Reading &read) {
  Cost cost;
  const std::size_t heapBefore = StartCountingHeap();
  const double before = CpuSeconds();
  cost.refusal = read(xml);
  cost.nanosecondsPerOctet = (CpuSeconds() - before) * 1e9 / static_cast<double>(xml.size());
  cost.heapOctets = GetMostHeap() - heapBefore;
  return cost;
}

bool TookTooLong(const Cost &cost, const std::string &xml) {
  return cost.nanosecondsPerOctet * static_cast<double>(xml.size()) > TOO_LONG_SECONDS * 1e9;
}

Cost Measure(const std::string &xml, const Reading &read, int rounds) {
  Cost best = MeasureOnce(xml, read);
  for (int round = 1; round < rounds && !TookTooLong(best, xml); ++round) {
    const Cost cost = MeasureOnce(xml, read);
    best.nanosecondsPerOctet = std::min(best.nanosecondsPerOctet, cost.nanosecondsPerOctet);
  }
  return best;
}

/// The worst value of something, and the shape that has it.
struct Worst {
  double value = 0;
  std::string shape;

  void Note(double candidate, const std::string &name) {
    if (candidate > value) {
      value = candidate;
      shape = name;
    }
  }
};

struct Summary {
  double genuine = 0; // nanoseconds for each octet
  Worst ratio;        // to the genuine token's cost for each octet, of any size
  Worst growth;       // of the cost for each octet, from the smallest size on; see MeasureShape
  Worst heap;         // octets
  std::size_t shapes = 0;
};

void MeasureShape(const HostileShape &shape, const std::string &title, const Reading &read, const Settings &settings,
                  Summary &summary) {
  std::printf("%-72s", title.c_str());
  double first = 0;
  Cost cost;
  for (const std::size_t size : settings.sizes) {
    const std::string xml = shape.make(size);
    cost = Measure(xml, read, settings.rounds);
    first = first == 0 ? cost.nanosecondsPerOctet : first;
    summary.ratio.Note(cost.nanosecondsPerOctet / summary.genuine, shape.name);
    // Growth below a genuine token's cost is ignored: its reason is that a large text no longer fits into the caches.
    summary.growth.Note(cost.nanosecondsPerOctet / std::max(first, summary.genuine), shape.name);
    summary.heap.Note(static_cast<double>(cost.heapOctets), shape.name);
    std::printf(" %9.2f", cost.nanosecondsPerOctet);
    if (TookTooLong(cost, xml)) {
      break;
    }
  }
  std::printf(" %6.1f MiB  %s\n", static_cast<double>(cost.heapOctets) / MIB,
              cost.refusal.empty() ? "accepted" : cost.refusal.substr(0, OUTCOME_LENGTH).c_str());
  std::fflush(stdout);
  ++summary.shapes;
}

Summary MeasureGenuine(const char *what, const Reading &read, const Settings &settings) {
  Summary summary;
  const Cost genuine = Measure(ReadFile(LARGE_TOKEN), read, settings.rounds + 2);
  if (!genuine.refusal.empty()) {
    throw std::runtime_error("the genuine token is refused: " + genuine.refusal);
  }
  summary.genuine = genuine.nanosecondsPerOctet;
  std::printf("%-72s %9.2f %26.1f MiB\n", what, summary.genuine, static_cast<double>(genuine.heapOctets) / MIB);
  return summary;
}

struct Summaries {
  Summary verification;
  Summary report;
};

Summaries MeasureAll(const Settings &settings) {
  Tarvel::Crypto::CertificateList trusted;
  for (const char *const file : {"/sts-rsa.crt", "/sts-rsa-2.crt", "/sts-ec256.crt", "/other.crt"}) {
    trusted.push_back(Tarvel::Crypto::LoadCertificates(std::string(TOKEN_DATA_DIR) + file).front());
  }
  const Reading verify = Verifying(trusted);
  const Reading explain = Explaining(trusted);
  Summaries summaries{MeasureGenuine("a genuine token of 5 MB, ns an octet and heap", verify, settings),
                      MeasureGenuine("  its report", explain, settings)};
  for (const HostileShape &shape : MakeHostileShapes(ReadFile(TOKEN_DATA_DIR "/bearer.xml"))) {
    MeasureShape(shape, shape.name, verify, settings, summaries.verification);
    MeasureShape(shape, "  its report", explain, settings, summaries.report);
  }
  return summaries;
}

void WriteWorst(const char *name, double value, const std::string &shape, std::ostream &out) {
  out << ",\n  \"" << name << "\": {\"value\": " << value << ", \"shape\": \"" << shape << "\"}";
}

void WriteFigures(const Summary &summary, std::ostream &out) {
  out << "\"ratio\": " << summary.ratio.value << ", \"shapes\": " << summary.shapes
      << ", \"genuine_ns_per_octet\": " << summary.genuine;
  WriteWorst("worst_ratio", summary.ratio.value, summary.ratio.shape, out);
  WriteWorst("worst_growth", summary.growth.value, summary.growth.shape, out);
  WriteWorst("worst_heap_mib", summary.heap.value / MIB, summary.heap.shape, out);
}

void WriteSummary(const Summaries &summaries, std::ostream &out) {
  out << "{\n\"hostile_shapes\": {";
  WriteFigures(summaries.verification, out);
  out << ",\n  \"report\": {";
  WriteFigures(summaries.report, out);
  out << "}}\n}\n";
}

Settings ReadArguments(const std::vector<std::string> &arguments) {
  Settings settings;
  for (std::size_t i = 0; i < arguments.size(); ++i) {
    if (arguments[i] == "--quick") {
      settings.sizes = {16 * KIB, 32 * KIB, 64 * KIB};
      settings.rounds = 1;
    } else if (arguments[i] == "--json" && i + 1 < arguments.size()) {
      settings.json = arguments[++i];
    } else {
      throw std::runtime_error("usage: hostile_shapes [--json FILE] [--quick]");
    }
  }
  return settings;
}

/// Keeps all memory in the process once it is allocated. Otherwise most of the cost of some documents would be the
/// kernel's work of providing the same memory again, and would depend on earlier sizes.
void KeepMemory() {
  ::mallopt(M_MMAP_MAX, 0);
  ::mallopt(M_TRIM_THRESHOLD, std::numeric_limits<int>::max());
}

void Run(const std::vector<std::string> &arguments) {
  const Settings settings = ReadArguments(arguments);
  KeepMemory();
  const Summaries summaries = MeasureAll(settings);
  if (settings.json.empty()) {
    WriteSummary(summaries, std::cout);
    return;
  }
  std::ofstream file(settings.json);
  WriteSummary(summaries, file);
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
    std::cerr << "hostile_shapes: " << error.what() << '\n';
    return EXIT_FAILURE;
  }
}
