// SPDX-License-Identifier: Apache-2.0

#include "token/token_signature.h"

#include "xml/form_text.h"
#include "xml/qualified_name.h"
#include "xml/refuse.h"
#include "xml/strict_checks.h"

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

constexpr ElementOfName EXPECTED{{Namespaces::DS, "Signature"}};

/// The URIs of the signature's references. They become a text only if it is needed.
struct UrisOf {
  const Signature *signature;
};

std::string FormatMessageArgument(const UrisOf &uris) {
  std::string text;
  for (const Signature::Reference &reference : uris.signature->GetReferences()) {
    text.append(text.empty() ? "" : ", ").append("\"").append(reference.uri).append("\"");
  }
  return text;
}

bool IsSignature(const NodeFilterIterator &iterator) {
  return ElementQNameIs(IteratorToElement(iterator), EXPECTED.name.localName, EXPECTED.name.namespaceUri);
}

void RefuseMissingSignature(const NodeFilterIterator &iterator, DeviationSink &sink) {
  Refuse(sink, iterator, EXPECTED, WhatIsAt{iterator.node}, "Expected element ds:Signature not found");
}

/// Null if the element is not a signature.
Ref<Signature> ReadSignature(const ElementNode &root, const ElementNode &element, DeviationSink &sink) {
  Ref<Signature> signature;
  try {
    Tarvel::Xml::Security::CreateSignatureFromDom(root, element, signature);
  } catch (const Tarvel::Xml::Security::SignatureSyntaxException &error) {
    Refuse(sink, element, EXPECTED, WhatIsAt{&element}, "Signature syntax error: %1", error.what());
    return {};
  }
  return signature;
}

/// Moves the cursor from a node that was refused to the first signature after it, and refuses each node in between. Returns
/// whether there is a signature. If not, the cursor does not move.
bool MoveToSignature(NodeFilterIterator &iterator, DeviationSink &sink) {
  NodeFilterIterator next = iterator;
  while (next.node && !IsSignature(next)) {
    next.MoveToSibling();
  }
  while (next.node && iterator.MoveToSibling().node != next.node) {
    RefuseMissingSignature(iterator, sink);
  }
  return next.node;
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

void ParseTokenSignature(NodeFilterIterator &iterator, const ElementNode &assertion, Ref<Signature> &signature,
                         DeviationSink &sink) {
  if (const ElementNode *const element = IteratorToElement(iterator)) {
    signature = ReadSignature(assertion, *element, sink);
  } else {
    RefuseMissingSignature(iterator, sink);
  }
  if (!IsSignature(iterator)) {
    if (!MoveToSignature(iterator, sink)) {
      return;
    }
    signature = ReadSignature(assertion, *IteratorToElement(iterator), sink);
  }
  if (signature && !CoversAssertion(*signature, GetTextAttribute(assertion, "ID"))) {
    Refuse(sink, iterator, "a reference to the assertion's ID, or to the whole document", UrisOf{signature.get()},
           TOKEN_NOT_COVERED);
  }
  iterator.MoveToSibling();
}

} // namespace SsoClient
