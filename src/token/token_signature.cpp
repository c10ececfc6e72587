// SPDX-License-Identifier: Apache-2.0

#include "token/token_signature.h"

#include "xml/strict_checks.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/message_formatter.h>
#include <tarvel/xml/security/exceptions.h>

#include <algorithm>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::Signature;

Ref<Signature> ReadSignature(const ElementNode &root, const ElementNode &element) {
  Ref<Signature> signature;
  try {
    Tarvel::Xml::Security::CreateSignatureFromDom(root, element, signature);
  } catch (const Tarvel::Xml::Security::SignatureSyntaxException &error) {
    throw ParseException(Tarvel::MessageFormatter::ASPrint("Signature syntax error: %1", error.what()));
  }
  return signature;
}

// An identifier refers to one element only: the platform does not verify a document in which a second element has it.
bool CoversAssertion(const Signature &signature, std::string_view assertionId) {
  const std::vector<Signature::Reference> &references = signature.GetReferences();
  return std::any_of(references.begin(), references.end(), [&](const Signature::Reference &reference) {
    const std::string_view uri = reference.uri;
    return uri.empty() || (uri.front() == '#' && uri.substr(1) == assertionId);
  });
}

} // namespace

void ParseTokenSignature(NodeFilterIterator &iterator, const ElementNode &assertion, Ref<Signature> &signature) {
  const ElementNode *const element = IteratorToElement(iterator);
  if (!element) {
    throw ParseException("Expected element ds:Signature not found");
  }
  signature = ReadSignature(assertion, *element);
  if (!CoversAssertion(*signature, GetTextAttribute(assertion, "ID"))) {
    throw ParseException("Token's signature must cover the entire token");
  }
  iterator.MoveToSibling();
}

} // namespace SsoClient
