// SPDX-License-Identifier: Apache-2.0

#include "compose/message_signing.h"
#include "compose/ws_security.h"
#include "model/namespaces.h"
#include "proof/message_text.h"
#include "proof/token_attachment.h"
#include "token/confirmation_key.h"
#include "xml/qualified_name.h"
#include "xml/xml_text.h"

#include <ssoclient/proof/sign_message.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/message_formatter.h>
#include <tarvel/core/string_util.h>
#include <tarvel/crypto/verifying_key.h>
#include <tarvel/xml/security/signature.h>

#include <algorithm>

namespace SsoClient {

namespace {

using Tarvel::InvalidArgumentException;
using Tarvel::MessageFormatter;
using Tarvel::Crypto::PrivateKey;
using Tarvel::Crypto::VerifyingKey;
using Tarvel::Xml::ElementNode;
namespace SignatureUri = Tarvel::Xml::Security::SignatureUri;

/// The key of `token`, with which a message can be signed.
Tarvel::Ref<const VerifyingKey> RequireUsableKey(const SamlToken &token) {
  if (token.GetConfirmationMethod() != SamlToken::HOLDER_OF_KEY) {
    throw InvalidArgumentException("a bearer token has no key with which to sign a message: use AttachToken");
  }
  Tarvel::Ref<const VerifyingKey> key = GetConfirmationKey(token);
  const std::string refusal = key ? key->GetRefusal() : "the token states no key that can be read";
  if (!refusal.empty()) {
    throw InvalidArgumentException("no message can be signed with the key of the token: " + refusal);
  }
  return key;
}

void RequireKeyOfToken(const PrivateKey &identity, const SamlToken &token, const VerifyingKey &key) {
  if (const Tarvel::Crypto::Certificate *const certificate = token.GetConfirmationCertificate()) {
    Tarvel::Crypto::RequireKeyMatchesCertificate(identity, *certificate);
  } else if (!IsSameKey(*Tarvel::Crypto::CreateVerifyingKey(identity), key)) {
    throw Tarvel::Crypto::KeyMismatchException("The private key does not belong to the key of the token");
  }
}

/// The algorithm for a key with which signatures are accepted.
std::string_view AlgorithmFor(const VerifyingKey &key) {
  if (key.GetAlgorithm() == "RSA") {
    return SignatureUri::RSA_SHA256;
  }
  switch (key.GetBits()) {
  case 256:
    return SignatureUri::ECDSA_SHA256;
  case 384:
    return SignatureUri::ECDSA_SHA384;
  default: // P-521
    return SignatureUri::ECDSA_SHA512;
  }
}

std::string NameOf(const MessagePart &part) {
  return Tarvel::StringUtil::Shorten(QNameView(part.namespaceUri, part.localName).ToString());
}

void RequireParts(const std::vector<MessagePart> &parts) {
  if (parts.size() > MAX_SIGNED_PARTS) {
    throw InvalidArgumentException(MessageFormatter::ASPrint("%1 header blocks are to be signed; at most %2 can be",
                                                             parts.size(), MAX_SIGNED_PARTS));
  }
  for (auto part = parts.begin(); part != parts.end(); ++part) {
    if (part->localName.empty()) {
      throw InvalidArgumentException("a header block to sign has an empty local name");
    }
    if (std::find(parts.begin(), part, *part) != part) {
      throw InvalidArgumentException("the header block '" + NameOf(*part) + "' is listed twice");
    }
    if (*part == MessagePart{std::string(Namespaces::WSSE), "Security"}) {
      throw InvalidArgumentException("the security header cannot be signed, because it will contain the signature");
    }
  }
}

} // namespace

std::string SignMessage(const std::string &envelope, const SamlToken &token, const PrivateKey &identity,
                        const std::vector<MessagePart> &parts, const SecurityHeaderOptions &options) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  ParseXML(envelope, document);
  SignMessage(*document, token, identity, parts, options);
  return WriteMessage(*document);
}

void SignMessage(Tarvel::Xml::Document &envelope, const SamlToken &token, const PrivateKey &identity,
                 const std::vector<MessagePart> &parts, const SecurityHeaderOptions &options) {
  const Tarvel::Ref<const VerifyingKey> key = RequireUsableKey(token);
  RequireKeyOfToken(identity, token, *key);
  RequireParts(parts);

  TokenAttachment attachment(envelope, token, options);
  std::vector<ElementNode *> elements;
  elements.reserve(parts.size() + 2);
  for (const MessagePart &part : parts) {
    elements.push_back(&attachment.FindPart(part));
  }
  attachment.Prepare();
  elements.insert(elements.begin(), {&attachment.GetBody(), &attachment.GetTimestamp()});
  std::vector<std::string> identifiers;
  identifiers.reserve(elements.size() + 1);
  for (ElementNode *const element : elements) {
    identifiers.push_back(attachment.Identify(*element));
  }
  // Without this, another token of the same key could take the place of this one.
  identifiers.push_back(token.GetId());
  const Tarvel::Ref<ElementNode> root(&attachment.GetEnvelope());
  attachment.Finish(SignIdentifiedElements(root, identifiers, AlgorithmFor(*key),
                                           WsseSamlKeyIdReferenceBuilder(token.GetId(), options.dialect), identity));
}

} // namespace SsoClient
