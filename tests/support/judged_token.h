// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares what a verifier explains about a token with what it does with the token.

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
  std::string exceptionClass;                        ///< unqualified; "undocumented" for any other
  std::string refusal;                               ///< the exception's message
  std::uint32_t line = 0;                            ///< of an `XMLParseException`
  std::uint32_t column = 0;
};

/// A judged text or element.
struct Judgement {
  Verification verification;
  SsoClient::TokenReport report;
  std::string contradictions; ///< one on each line: what the report says wrongly; empty if it is right
};

/// Verifies and explains `xml`. The clock must not move during the call.
Judgement JudgeText(const JudgedVerifier &verifier, const std::string &xml);

/// The same for an element.
Judgement JudgeElement(const JudgedVerifier &verifier, const Tarvel::Xml::ElementNode &element);

} // namespace Testing
