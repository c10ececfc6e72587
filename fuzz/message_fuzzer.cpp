// SPDX-License-Identifier: Apache-2.0
/// @file
/// Different receivers verify and explain arbitrary bytes, read as a SOAP message: the report agrees with the verification,
/// explaining throws nothing, and a verification ends with a documented exception, or with a message whose body is covered if
/// it is signed.

#include "support/data_file.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/proof/message_verifier.h>
#include <tarvel/core/environment.h>
#include <tarvel/xml/parser.h>

#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using Tarvel::Ref;
using Tarvel::Crypto::Certificate;

Ref<const Certificate> CertificateOf(const std::string &name) {
  return Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/" + name + ".crt")).front();
}

struct Receiver {
  MessageVerifier verifier;
  Ref<const Certificate> peerCertificate;
};

std::vector<Receiver> MakeReceivers() {
  const Tarvel::Crypto::CertificateList trusted = {CertificateOf("sts-rsa")};
  MessageVerifierOptions lenient;
  lenient.acceptBearer = true;
  lenient.requireTimestamp = false;
  MessageVerifierOptions demanding;
  demanding.requiredParts = {{"urn:a", "To"}};
  demanding.requireTokenCovered = true;
  VerifyOptions saml2;
  saml2.profile = TokenProfile::SAML2;
  return {{MessageVerifier(TokenVerifier(trusted)), {}},
          {MessageVerifier(TokenVerifier(trusted, saml2), lenient), CertificateOf("holder")},
          {MessageVerifier(TokenVerifier(trusted), demanding), {}}};
}

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

/// The exception's text; empty if the message is accepted.
std::string RefusalOf(const Receiver &receiver, const std::string &text) {
  try {
    const VerifiedMessage message = receiver.verifier.Verify(text, receiver.peerCertificate.get());
    Require(message.token && message.body && message.document);
    Require(message.covered.empty() == (message.proof != ProofKind::MESSAGE_SIGNATURE));
    Require(message.covered.empty() || message.IsCovered(*message.body));
    return {};
  } catch (const Tarvel::Xml::XMLParseException &refusal) {
    return refusal.what();
  } catch (const SsoException &refusal) {
    return refusal.what();
  }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  static const Tarvel::ScopedEnvironment clock({[] { return std::int64_t{1'767'323'045'006'000}; }, {}});
  static const std::vector<Receiver> receivers = MakeReceivers();
  const std::string text(reinterpret_cast<const char *>(data), size);
  for (const Receiver &receiver : receivers) {
    const std::string refusal = RefusalOf(receiver, text);
    const MessageReport report = receiver.verifier.Explain(text, receiver.peerCertificate.get());
    Require(report.refusal == refusal);
    Require(report.accepted == refusal.empty());
    Require(!WriteMessageReport(report).empty());
  }
  return 0;
}
