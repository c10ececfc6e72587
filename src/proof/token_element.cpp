// SPDX-License-Identifier: Apache-2.0

#include "proof/token_element.h"

#include "compose/ws_security.h"
#include "model/namespaces.h"
#include "proof/signature_references.h"
#include "proof/soap_parts.h"
#include "xml/tree_walk.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <string_view>

namespace SsoClient {

namespace {

using Tarvel::Xml::AsElement;
using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

void RequireNotInclusive(const ContextOfForm &context) {
  if (context.isInclusive) {
    throw Tarvel::InvalidArgumentException(
        "the signature of the token uses inclusive canonicalization, so it would not be valid in a message");
  }
}

bool HasDefaultNamespace(const ElementNode &element) noexcept {
  std::string_view uri;
  return element.LookupNamespace(std::string_view(), uri) && !uri.empty();
}

} // namespace

TokenElement::TokenElement(const SamlToken &token) : m_identifiers{token.GetId()} {
  InsertSamlTokenBuilder(token)->build(m_assertion);
  ReadOwnSignatures();
  AddIdentifiers();
}

// Signatures deeper in the token, such as those of an assertion in its advice, are content: no receiver of the token checks them.
void TokenElement::ReadOwnSignatures() {
  for (const Node *child = m_assertion->GetFirstChild(); child; child = child->GetNextSibling()) {
    const ElementNode *const signature = AsElement(child);
    if (!signature || !signature->HasQName(Namespaces::DS, "Signature")) {
      continue;
    }
    for (const Node *node = signature; node; node = NextInTree(node, signature)) {
      const ElementNode *const element = AsElement(node);
      if (element && element->HasQName(Namespaces::DS, "CanonicalizationMethod")) {
        const ContextOfForm context = ReadCanonicalizationMethod(*element);
        RequireNotInclusive(context);
        AddIncludedPrefixes(*signature, context.prefixList);
      } else if (element && element->HasQName(Namespaces::DS, "Reference")) {
        const SignatureReference reference = ReadSignatureReference(*element);
        RequireNotInclusive(reference.context);
        if (reference.uri && reference.uri->GetValue().empty()) {
          throw Tarvel::InvalidArgumentException(
              "the signature of the token refers to its whole document, so it would not be valid in a message");
        }
        AddIncludedPrefixes(*m_assertion, reference.context.prefixList);
      }
    }
  }
}

void TokenElement::AddIncludedPrefixes(const ElementNode &apex, std::string_view prefixList) {
  ForEachPrefix(prefixList, [&](std::string_view prefix) {
    std::string_view uri;
    if (!apex.LookupNamespace(prefix, uri)) {
      m_includedPrefixes.emplace_back(prefix);
    }
    return true;
  });
}

void TokenElement::AddIdentifiers() {
  for (const Node *node = m_assertion.get(); node; node = NextInTree(node, m_assertion.get())) {
    const ElementNode *const element = AsElement(node);
    for (const Attribute *attribute = element ? element->GetFirstAttribute() : nullptr; attribute;
         attribute = attribute->GetNext()) {
      if (IsIdentifier(*attribute, *element)) {
        m_identifiers.emplace(attribute->GetValue());
      }
    }
  }
}

void TokenElement::PrepareFor(const ElementNode &parent) const {
  std::string_view uri;
  for (const std::string &prefix : m_includedPrefixes) {
    if (parent.LookupNamespace(prefix, uri)) {
      throw InvalidMessageException(
          "The signature of the token would not be valid in the message: it includes the prefix '" +
          Tarvel::StringUtil::Shorten(prefix) + "', which the message declares");
    }
  }
  // An exclusive canonical form does not contain this declaration, so the token's signature stays valid.
  if (HasDefaultNamespace(parent) && !HasDefaultNamespace(*m_assertion)) {
    m_assertion->DefineAttribute("xmlns", "");
  }
}

} // namespace SsoClient
