// SPDX-License-Identifier: Apache-2.0
/// @file
/// The rules by which a message is verified, in their order.
///
/// Each of them reports to sinks, and continues if the sinks do not throw. It then needs only what an earlier rule could
/// read, so a report can run it even if an earlier rule has refused the message.

#pragma once

#include "proof/message_sinks.h"
#include "proof/message_timestamp.h"
#include "proof/soap_parts.h"

#include <ssoclient/proof/message_verifier.h>
#include <ssoclient/proof/proof_kind.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/verifying_key.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/node.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <memory>
#include <vector>

namespace SsoClient {

/// A header with more signatures is refused, because their keys take long to read.
constexpr std::size_t MAX_HEADER_SIGNATURES = 10;

/// What the rules have read of a message. Pointers to elements are valid as long as the document.
struct CheckedMessage {
  SoapEnvelope envelope;
  const Tarvel::Xml::ElementNode *security = nullptr; ///< the security header; null if there is none
  MessageTimestamp timestamp;
  const Tarvel::Xml::ElementNode *assertion =
      nullptr;                            ///< the first token of the security header; null if there is none
  std::shared_ptr<const SamlToken> token; ///< null until it has been verified
  Tarvel::Ref<const Tarvel::Crypto::VerifyingKey> key; ///< of the token; null for a bearer token
  boost::optional<ProofKind> proof;                    ///< set if the sender has proved what the options require
  std::vector<VerifiedMessage::CoveredElement> covered;
  std::vector<std::uint8_t> signedInfoDigest; ///< of the proof signature; empty without one
};

/// What the rules compare a message with. Everything must outlive their call.
struct MessageRules {
  const MessageVerifierOptions &options;
  const Tarvel::Crypto::Certificate *peerCertificate; ///< null if the sender did not authenticate in TLS
  const MessageSinks &sinks;
};

/// Checks that the document is an envelope with one body, after at most one header.
void CheckEnvelope(const Tarvel::Xml::Document &document, const MessageRules &rules, CheckedMessage &message);

/// Checks that there is one security header for the role.
void CheckSecurityHeader(const MessageRules &rules, CheckedMessage &message);

/// Checks the timestamp of the security header, which must not be null.
void CheckTimestamp(const MessageRules &rules, CheckedMessage &message);

/// Checks that there is one token in the security header, which must not be null.
void FindToken(const MessageRules &rules, CheckedMessage &message);

/// Verifies the token, which must have been found. It stays null if it has no canonical form.
/// @throws ParseException and InvalidSignatureException, even if the sinks do not throw, when the token is refused.
void VerifyToken(const TokenVerifier &tokens, const MessageRules &rules, CheckedMessage &message);

/// Checks that the sender has proved what the options require, with the token, which must not be null.
/// @throws Tarvel::TypeMismatchException for a peer certificate that this library has not made, and the
///         exceptions of OpenSSL's failures.
void CheckProof(const Tarvel::Xml::Document &document, const MessageRules &rules, CheckedMessage &message);

/// Checks that each part that must be covered is there once and, if the proof is a signature, that it is covered.
void CheckParts(const MessageRules &rules, const CheckedMessage &message);

} // namespace SsoClient
