// SPDX-License-Identifier: Apache-2.0

#include "judged_message.h"

#include "support/data_file.h"
#include "support/exception_class.h"

#include <algorithm>
#include <exception>
#include <sstream>
#include <stdexcept>
#include <string_view>
#include <typeinfo>

namespace Messages {

namespace {

using namespace SsoClient;
using Tarvel::Ref;
using Tarvel::Crypto::Certificate;

Ref<const Certificate> CertificateOf(const std::string &name) {
  return Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/" + name + ".crt")).front();
}

std::string ClassOf(const std::exception &failure) {
  const std::type_info &type = typeid(failure);
  if (type == typeid(InvalidMessageException)) {
    return "InvalidMessageException";
  }
  if (type == typeid(InvalidProofException)) {
    return "InvalidProofException";
  }
  if (type == typeid(StaleMessageException)) {
    return "StaleMessageException";
  }
  return Testing::ClassOf(failure);
}

/// What the report states differently from the verification. The checks are examined without the library's own rules.
std::string FindContradictions(const Decision &decision) {
  const MessageReport &report = decision.report;
  std::string contradictions;
  const auto require = [&](bool isTrue, const char *text) {
    contradictions += isTrue ? std::string() : std::string(text) + "\n";
  };
  require(report.accepted == decision.message.has_value(), "accepted");
  require(report.refusal == decision.refusal, "refusal");
  require(report.checks.size() == 7, "number of checks");
  const auto failed = std::find_if(report.checks.begin(), report.checks.end(),
                                   [](const auto &check) { return check.outcome != TokenReport::Outcome::PASSED; });
  require((failed == report.checks.end()) == report.accepted, "accepted without all checks");
  require(failed == report.checks.end() || !failed->findings.empty(),
          "the first check that did not pass has no finding");
  for (const MessageReport::CheckResult &check : report.checks) {
    require(check.findings.empty() == (check.outcome != TokenReport::Outcome::FAILED), "findings without failure");
    require(!check.summary.empty(), "no summary");
  }
  if (decision.message) {
    require(report.covered.size() == decision.message->covered.size(), "covered elements");
    require(report.token && report.token->accepted, "token");
  }
  return contradictions;
}

} // namespace

Receiver MakeReceiver(const std::string &options) {
  VerifyOptions tokenOptions;
  MessageVerifierOptions messageOptions;
  Ref<const Certificate> peer;
  std::istringstream words(options);
  for (std::string word; words >> word;) {
    if (word == "saml2") {
      tokenOptions.profile = TokenProfile::SAML2;
    } else if (word == "bearer") {
      messageOptions.acceptBearer = true;
    } else if (word == "to") {
      messageOptions.requiredParts = {{"urn:a", "To"}};
    } else if (word == "token") {
      messageOptions.requireTokenCovered = true;
    } else if (word == "role") {
      messageOptions.role = "urn:role";
    } else if (word == "no-timestamp") {
      messageOptions.requireTimestamp = false;
    } else if (word == "tls") {
      peer = CertificateOf("holder");
    } else if (word == "tls-other") {
      peer = CertificateOf("other");
    } else {
      throw std::logic_error("unknown option: " + word);
    }
  }
  return {MessageVerifier(TokenVerifier({CertificateOf("sts-rsa")}, tokenOptions), messageOptions), peer};
}

Decision Verify(const Receiver &receiver, const std::string &message) {
  Decision decision;
  try {
    decision.message = receiver.verifier.Verify(message, receiver.peerCertificate.get());
  } catch (const std::exception &failure) {
    decision.exceptionClass = ClassOf(failure);
    decision.refusal = failure.what();
  }
  return decision;
}

Decision Judge(const Receiver &receiver, const std::string &message) {
  Decision decision = Verify(receiver, message);
  decision.report = receiver.verifier.Explain(message, receiver.peerCertificate.get());
  decision.contradictions = FindContradictions(decision);
  return decision;
}

} // namespace Messages
