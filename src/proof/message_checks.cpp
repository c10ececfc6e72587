// SPDX-License-Identifier: Apache-2.0

#include "proof/message_checks.h"

#include "model/namespaces.h"
#include "proof/covered_elements.h"
#include "proof/proof_signature.h"
#include "token/confirmation_key.h"
#include "xml/form_text.h"
#include "xml/qualified_name.h"
#include "xml/refuse.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/exceptions.h>

#include <string>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Xml::AsElement;
using Tarvel::Xml::ElementNode;

const char *TextOf(EnvelopeFault fault) noexcept {
  switch (fault) {
  case EnvelopeFault::NOT_AN_ENVELOPE:
    return "The document is not a SOAP envelope";
  case EnvelopeFault::OTHER_VERSION:
    return "The envelope is neither of SOAP 1.1 nor of SOAP 1.2";
  case EnvelopeFault::OTHER_CONTENT:
    return "The envelope has content that is neither its header nor its body";
  case EnvelopeFault::SECOND_HEADER:
    return "The envelope has a second header";
  case EnvelopeFault::HEADER_AFTER_BODY:
    return "The header of the envelope is after its body";
  case EnvelopeFault::SECOND_BODY:
    return "The envelope has a second body";
  case EnvelopeFault::NO_BODY:
    return "The envelope has no body";
  case EnvelopeFault::NONE:
    break;
  }
  return "";
}

/// The place of a fault: the node itself if it is an element, or the element that contains it.
const ElementNode *PlaceOf(const Tarvel::Xml::Node *node) noexcept {
  const ElementNode *const element = AsElement(node);
  return element || !node ? element : AsElement(node->GetParent());
}

/// "the last receiver", or the role.
struct ReceiverOf {
  const MessageVerifierOptions &options;
};

std::string FormatMessageArgument(const ReceiverOf &receiver) {
  const boost::optional<std::string> &role = receiver.options.role;
  return role && !role->empty() ? "the role \"" + Tarvel::StringUtil::Shorten(*role) + "\""
                                : std::string("the last receiver");
}

/// Whether the key of a TLS certificate is the token's.
bool IsKeyOf(const Certificate &peerCertificate, const CheckedMessage &message) {
  return message.key && Tarvel::Crypto::IsSameKey(*message.key, *Tarvel::Crypto::CreateVerifyingKey(
                                                                    Ref<const Certificate>(&peerCertificate)));
}

/// Checks that a bearer token is accepted, and that no signature refers to it: it has no key.
void CheckBearer(const ElementNode *signature, const MessageRules &rules, CheckedMessage &message) {
  if (signature) {
    Refuse(rules.sinks.proof, *signature, "", "",
           "A signature refers to the token, which is a bearer token and has no key");
  } else if (!rules.options.acceptBearer) {
    Refuse(rules.sinks.proof, message.assertion, "a holder-of-key token", "a bearer token",
           "The token is a bearer token, with which its sender proves nothing");
  } else {
    message.proof = ProofKind::BEARER;
  }
}

void CheckTlsKey(const MessageRules &rules, CheckedMessage &message) {
  if (!rules.peerCertificate) {
    Refuse(rules.sinks.proof, message.security, "a signature by the token's key", "",
           "The message has no signature by the token's key");
  } else if (!IsKeyOf(*rules.peerCertificate, message)) {
    Refuse(rules.sinks.proof, message.security, "a signature by the token's key, or this key in TLS", "",
           "The message has no signature by the token's key, and the key of the TLS certificate is another key");
  } else {
    message.proof = ProofKind::TLS_CERTIFICATE;
  }
}

void RequireCovered(const ElementNode &element, const char *part, const CheckedMessage &message, DeviationSink &sink) {
  if (message.proof == ProofKind::MESSAGE_SIGNATURE && !IsCoveredBy(message.covered, element)) {
    Refuse(sink, element, "covered by the signature", "", "The signature does not cover the %1", part);
  }
}

void CheckPart(const MessagePart &part, const CheckedMessage &message, DeviationSink &sink) {
  const QNameView name(part.namespaceUri, part.localName);
  const FoundElements found = FindHeaderBlocks(message.envelope, part);
  if (!found.first) {
    Refuse(sink, message.envelope.header, ElementOfName{name}, "", "The message has no header block '%1'", name);
  } else if (found.second) {
    Refuse(sink, *found.second, "one", "two", "The message has two header blocks '%1'", name);
  } else if (message.proof == ProofKind::MESSAGE_SIGNATURE && !IsCoveredBy(message.covered, *found.first)) {
    Refuse(sink, *found.first, "covered by the signature", "", "The signature does not cover the header block '%1'",
           name);
  }
}

} // namespace

void CheckEnvelope(const Tarvel::Xml::Document &document, const MessageRules &rules, CheckedMessage &message) {
  message.envelope = ReadEnvelope(document.GetDocumentElement());
  if (message.envelope.fault != EnvelopeFault::NONE) {
    Refuse(rules.sinks.form, PlaceOf(message.envelope.place), "a SOAP envelope with at most one header, then one body",
           WhatIsAt{message.envelope.place}, TextOf(message.envelope.fault));
  }
}

void CheckSecurityHeader(const MessageRules &rules, CheckedMessage &message) {
  const FoundElements found =
      FindSecurityHeaders(message.envelope, rules.options.role ? *rules.options.role : std::string());
  message.security = found.first;
  if (!found.first) {
    Refuse(rules.sinks.form, message.envelope.header ? message.envelope.header : message.envelope.element,
           "element wsse:Security", "", "There is no security header for %1", ReceiverOf{rules.options});
  } else if (found.second) {
    Refuse(rules.sinks.form, *found.second, "one", "two", "There are two security headers for %1",
           ReceiverOf{rules.options});
  }
}

void CheckTimestamp(const MessageRules &rules, CheckedMessage &message) {
  const MessageVerifierOptions &options = rules.options;
  message.timestamp = ReadTimestamp(*message.security, options.requireTimestamp, rules.sinks.form);
  CheckTime(message.timestamp, {options.clockToleranceSec, options.maxAgeSec}, rules.sinks.time);
}

void FindToken(const MessageRules &rules, CheckedMessage &message) {
  const FoundElements found = FindChildren(message.security, Namespaces::SAML, "Assertion");
  message.assertion = found.first;
  if (!found.first) {
    Refuse(rules.sinks.form, *message.security, "element saml:Assertion", "",
           "The security header has no SAML 2.0 token");
  } else if (found.second) {
    Refuse(rules.sinks.form, *found.second, "one", "two", "The security header has two SAML 2.0 tokens");
  }
}

void VerifyToken(const TokenVerifier &tokens, const MessageRules &rules, CheckedMessage &message) {
  try {
    message.token = tokens.Verify(*message.assertion);
  } catch (const Tarvel::Xml::Security::XmlSecurityException &error) {
    Refuse(rules.sinks.form, *message.assertion, "an element with a canonical form", "",
           "The token of the message is not accepted: %1", error.what());
  }
}

void CheckProof(const Tarvel::Xml::Document &document, const MessageRules &rules, CheckedMessage &message) {
  message.key = GetConfirmationKey(*message.token);
  const ElementNode *const signature =
      FindProofSignature(*message.security, *message.token, message.key.get(), rules.sinks.form);
  if (message.token->GetConfirmationMethod() != SamlToken::HOLDER_OF_KEY) {
    CheckBearer(signature, rules, message);
    return;
  }
  if (!signature || !message.key) {
    CheckTlsKey(rules, message);
    return;
  }
  const boost::optional<Tarvel::Xml::Security::Signature::Coverage> coverage =
      VerifyProofSignature(*signature, *message.key, rules.sinks.proof);
  if (coverage) {
    message.covered = ListCoveredElements(coverage->targets, *signature, document);
    message.signedInfoDigest = coverage->signedInfoDigest;
    message.proof = ProofKind::MESSAGE_SIGNATURE;
  }
}

void CheckParts(const MessageRules &rules, const CheckedMessage &message) {
  DeviationSink &sink = rules.sinks.form;
  if (message.envelope.body) {
    RequireCovered(*message.envelope.body, "body", message, sink);
  }
  if (message.timestamp.element) {
    RequireCovered(*message.timestamp.element, "timestamp", message, sink);
  }
  if (rules.options.requireTokenCovered && message.assertion) {
    RequireCovered(*message.assertion, "token", message, sink);
  }
  for (const MessagePart &part : rules.options.requiredParts) {
    CheckPart(part, message, sink);
  }
}

} // namespace SsoClient
