// SPDX-License-Identifier: Apache-2.0

#include "explained.h"

#include "integration/token_attacks/heap_octets.h"
#include "support/data_file.h"
#include "support/report_texts.h"

#include <ssoclient/token_verifier.h>

namespace Reports {

using SsoClient::TokenReport;
using SsoClient::TokenVerifier;

namespace {

TokenVerifier MakeVerifier() {
  Tarvel::Crypto::CertificateList trusted;
  for (const char *const name : {"sts-rsa", "sts-ec256", "other"}) {
    trusted.push_back(
        Tarvel::Crypto::CreateCertificateFromPem(Testing::ReadDataFile("tokens/" + std::string(name) + ".crt")));
  }
  SsoClient::VerifyOptions options;
  options.acceptedAudiences = {"https://nowhere.example/"};
  options.requiredConfirmation = SsoClient::SamlToken::HOLDER_OF_KEY;
  return TokenVerifier(trusted, options);
}

} // namespace

Explained Explain(const std::string &xml) {
  static const TokenVerifier verifier = [] {
    TokenVerifier made = MakeVerifier();
    made.Explain(Testing::ReadDataFile("tokens/bearer.xml")); // prepares what a process prepares only once
    return made;
  }();
  Explained explained;
  const Attacks::HeapCount heap;
  explained.report = verifier.Explain(xml);
  explained.allocated = heap.GetAllocated();
  explained.peak = heap.GetPeak();
  return explained;
}

std::size_t CountTexts(const TokenReport &report) {
  std::size_t octets = 0;
  for (const Testing::ReportText &text : Testing::PrintableTextsOf(report)) {
    octets += text.text.size();
  }
  return octets;
}

std::size_t CountFindings(const TokenReport &report) {
  std::size_t findings = 0;
  for (const TokenReport::CheckResult &result : report.checks) {
    findings += result.findings.size();
  }
  return findings;
}

} // namespace Reports
