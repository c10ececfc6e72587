// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/message_verifier.h>

#include "proof/covered_elements.h"
#include "proof/message_checks.h"
#include "proof/message_explainer.h"
#include "proof/replay_check.h"
#include "xml/xml_text.h"

#include <tarvel/core/exception.h>

#include <algorithm>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::InvalidArgumentException;
using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Xml::Document;

TimeWindow WindowOf(const MessageVerifierOptions &options) {
  return {options.clockToleranceSec, options.maxAgeSec};
}

const MessageVerifierOptions &Consistent(const MessageVerifierOptions &options) {
  RequireTimeWindow(WindowOf(options), "MessageVerifierOptions");
  if (std::any_of(options.requiredParts.begin(), options.requiredParts.end(),
                  [](const MessagePart &part) { return part.localName.empty(); })) {
    throw InvalidArgumentException("MessageVerifierOptions::requiredParts has a part without a local name");
  }
  if (options.replayGuard && !options.requireTimestamp) {
    throw InvalidArgumentException("MessageVerifierOptions::replayGuard needs requireTimestamp");
  }
  return options;
}

/// Asks the guard, if there is one and the message is signed.
ReplayProtection GuardAgainstReplay(const CheckedMessage &message, const MessageVerifierOptions &options) {
  if (!options.replayGuard || message.proof != ProofKind::MESSAGE_SIGNATURE) {
    return ReplayProtection::NOT_GUARDED;
  }
  const MessageTimestamp &timestamp = message.timestamp;
  RequireFirstReceipt(*options.replayGuard,
                      IdentifyMessage(SignedAs::SOAP_MESSAGE, message.signedInfoDigest, *message.key),
                      GetStaleTime(timestamp.created.value(), timestamp.expires, WindowOf(options)));
  return ReplayProtection::GUARDED;
}

VerifiedMessage VerifyDocument(const Ref<const Document> &document, const Certificate *peerCertificate,
                               const TokenVerifier &tokens, const MessageVerifierOptions &options) {
  const MessageRules rules{options, peerCertificate, ThrowingMessageSinks()};
  CheckedMessage message;
  CheckEnvelope(*document, rules, message);
  CheckSecurityHeader(rules, message);
  CheckTimestamp(rules, message);
  FindToken(rules, message);
  VerifyToken(tokens, rules, message);
  CheckProof(*document, rules, message);
  CheckParts(rules, message);

  VerifiedMessage verified;
  verified.replay = GuardAgainstReplay(message, options);
  verified.token = std::move(message.token);
  verified.proof = message.proof.value();
  verified.document = document;
  verified.body = message.envelope.body;
  verified.covered = std::move(message.covered);
  verified.created = message.timestamp.created;
  verified.expires = message.timestamp.expires;
  return verified;
}

} // namespace

struct MessageVerifier::State {
  State(const TokenVerifier &tokenVerifier, const MessageVerifierOptions &verifierOptions)
      : tokens(tokenVerifier), options(Consistent(verifierOptions)) {}

  const TokenVerifier tokens;
  const MessageVerifierOptions options;
};

bool VerifiedMessage::IsCovered(const Tarvel::Xml::ElementNode &element) const noexcept {
  return IsCoveredBy(covered, element);
}

MessageVerifier::MessageVerifier(const TokenVerifier &tokens, const MessageVerifierOptions &options)
    : m_state(std::make_shared<const State>(tokens, options)) {}

VerifiedMessage MessageVerifier::Verify(const std::string &message) const {
  return Verify(message, nullptr);
}

VerifiedMessage MessageVerifier::Verify(const std::string &message, const Certificate *peerCertificate) const {
  Ref<Document> document;
  ParseXML(message, document);
  return VerifyDocument(document, peerCertificate, m_state->tokens, m_state->options);
}

VerifiedMessage MessageVerifier::Verify(const Ref<const Document> &message, const Certificate *peerCertificate) const {
  if (!message) {
    throw InvalidArgumentException("there is no message to verify");
  }
  return VerifyDocument(message, peerCertificate, m_state->tokens, m_state->options);
}

MessageReport MessageVerifier::Explain(const std::string &message) const {
  return Explain(message, nullptr);
}

MessageReport MessageVerifier::Explain(const std::string &message, const Certificate *peerCertificate) const {
  return ExplainMessage(message, m_state->tokens, m_state->options, peerCertificate);
}

} // namespace SsoClient
