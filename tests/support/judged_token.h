// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares a verifier's report on a token with the same verifier's verification of it.

#pragma once

#include <ssoclient/token_verifier.h>

#include <cstdint>
#include <memory>
#include <string>

namespace Testing {

/// A verifier, and what it was made from.
struct JudgedVerifier {
  JudgedVerifier(const Tarvel::Crypto::CertificateList &certificates, const SsoClient::VerifyOptions &choice)
      : trusted(certificates), options(choice), verifier(certificates, choice) {}

  Tarvel::Crypto::CertificateList trusted;
  SsoClient::VerifyOptions options;
  SsoClient::TokenVerifier verifier;
};

/// What `Verify` did.
struct Verification {
  std::shared_ptr<const SsoClient::SamlToken> token; ///< null if it was refused
  std::string exceptionClass;                        ///< unqualified, or "undocumented"; empty if it was accepted
  std::string refusal;                               ///< the exception's message
  std::uint32_t line = 0;                            ///< of an `XMLParseException`
  std::uint32_t column = 0;
};

/// The results for a text or an element.
struct Judgement {
  Verification verification;
  SsoClient::TokenReport report;
  std::string contradictions; ///< the mistakes of the report, one on each line; empty if it is right
};

/// Verifies and explains `xml`. The clock must not move during the call.
Judgement JudgeText(const JudgedVerifier &verifier, const std::string &xml);

/// The same for an element.
Judgement JudgeElement(const JudgedVerifier &verifier, const Tarvel::Xml::ElementNode &element);

} // namespace Testing
