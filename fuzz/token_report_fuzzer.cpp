// SPDX-License-Identifier: Apache-2.0
/// @file
/// Different verifiers explain arbitrary bytes, read as a token: the report agrees with the verification of the bytes,
/// keeps all promises of token_report.h, and explaining throws nothing. The same for the tree of a well-formed text.

#include "support/data_file.h"
#include "support/judged_token.h"
#include "xml/xml_text.h"

#include <tarvel/core/environment.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

using SsoClient::VerifyOptions;
using Testing::JudgedVerifier;

Tarvel::Ref<const Tarvel::Crypto::Certificate> Certificate(const std::string &name) {
  return Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/" + name + ".crt")).front();
}

std::vector<JudgedVerifier> MakeVerifiers() {
  VerifyOptions demanding;
  demanding.clockToleranceSec = 0;
  demanding.acceptedAudiences = {"https://files.corp.example/"};
  demanding.acceptUnrestrictedAudience = false;
  demanding.requiredConfirmation = SsoClient::SamlToken::HOLDER_OF_KEY;
  VerifyOptions saml2;
  saml2.profile = SsoClient::TokenProfile::SAML2;
  VerifyOptions demandingSaml2 = demanding;
  demandingSaml2.profile = SsoClient::TokenProfile::SAML2;
  demandingSaml2.acceptedRecipients = {"https://files.corp.example/consume"};
  demandingSaml2.expectedInResponseTo = "_request-1";
  demandingSaml2.senderAddress = "192.0.2.7";
  return {JudgedVerifier({Certificate("sts-rsa"), Certificate("sts-ec256")}, VerifyOptions()),
          JudgedVerifier({Certificate("sts-rsa")}, demanding), JudgedVerifier({}, VerifyOptions()),
          JudgedVerifier({Certificate("sts-rsa")}, saml2), JudgedVerifier({Certificate("sts-rsa")}, demandingSaml2)};
}

void Require(const Testing::Judgement &judgement) {
  if (!judgement.contradictions.empty()) {
    std::fputs(judgement.contradictions.c_str(), stderr);
    std::abort();
  }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  static const Tarvel::ScopedEnvironment clock({[] { return std::int64_t{1'767'323'045'006'000}; }, {}});
  static const std::vector<JudgedVerifier> verifiers = MakeVerifiers();
  const std::string xml(reinterpret_cast<const char *>(data), size);
  for (const JudgedVerifier &verifier : verifiers) {
    Require(Testing::JudgeText(verifier, xml));
  }
  try {
    Tarvel::Ref<Tarvel::Xml::Document> document;
    SsoClient::ParseXML(xml, document);
    Require(Testing::JudgeElement(verifiers.front(), *document->GetDocumentElement()));
    Require(Testing::JudgeElement(verifiers[3], *document->GetDocumentElement()));
  } catch (const Tarvel::Xml::XMLParseException &) {
  }
  return 0;
}
