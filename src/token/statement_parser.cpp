// SPDX-License-Identifier: Apache-2.0

#include "token/statement_parser.h"

#include "model/namespaces.h"
#include "xml/qualified_name.h"
#include "xml/strict_checks.h"

#include <string>
#include <utility>

namespace SsoClient {

using Tarvel::Xml::ElementNode;

namespace {

void ParseAttributeValue(NodeFilterIterator &iterator, std::string &value) {
  const ElementNode &element = RequireElementQName(IteratorToElement(iterator), "AttributeValue", Namespaces::SAML);
  // Services may state the type of a value. It is ignored: every value is read as text.
  if (element.GetFirstAttribute()) {
    RequireElementAttributesQNames(element, {}, {XSI_TYPE});
  }
  RequireTextualContent(iterator, value);
  iterator.MoveToSibling();
}

/// An upper limit of the number of SAML attributes: it counts each element with at least one XML attribute. The caller
/// reserves memory for all of them at once, because a sequence that grows step by step needs up to three times the
/// memory.
std::size_t CountPossibleAttributes(const ElementNode &statement) {
  std::size_t count = 0;
  for (const Tarvel::Xml::Node *child = statement.GetFirstChild(); child; child = child->GetNextSibling()) {
    const ElementNode *const element = Tarvel::Xml::AsElement(child);
    count += element && element->GetFirstAttribute() ? 1U : 0U;
  }
  return count;
}

} // namespace

bool TryParseAdviceElement(NodeFilterIterator &iterator, boost::optional<AdviceType> &advice) {
  const ElementNode *const element = IteratorToElement(iterator);
  if (!ElementQNameIs(element, "Advice", Namespaces::SAML)) {
    return false;
  }
  RequireNoAttributes(*element);
  advice.emplace();
  NodeFilterIterator child = iterator.GetChild();
  while (child.node) {
    ParseRsaAdviceElement(child, advice->advice.emplace_back());
  }
  iterator.MoveToSibling();
  return true;
}

void ParseRsaAdviceElement(NodeFilterIterator &iterator, Advice &advice) {
  const ElementNode &element = RequireElementQName(IteratorToElement(iterator), "RSAAdvice", Namespaces::RSA_SAML2);
  RequireElementAttributesNames(element, {"AdviceSource"}, {});
  advice.source = GetTextAttribute(element, "AdviceSource");
  NodeFilterIterator child = iterator.GetChild();
  while (child.node) {
    AttributeType attribute;
    ParseAttributeElement(child, attribute);
    advice.attributes.push_back({std::move(attribute.Name), std::move(attribute.values)});
  }
  iterator.MoveToSibling();
}

void ParseAuthnStatementElement(NodeFilterIterator &iterator, AuthnStatementType &statement) {
  const ElementNode &element = RequireElementQName(IteratorToElement(iterator), "AuthnStatement", Namespaces::SAML);
  RequireElementAttributesNames(element, {"AuthnInstant"}, {});
  GetDateAttribute(element, "AuthnInstant", statement.AuthnInstant);
  NodeFilterIterator child = iterator.GetChild();
  ParseAuthnContextElement(child, statement.AuthnContext);
  RequireNoFurtherNode(child, "Unexpected elements after AuthnContext");
  iterator.MoveToSibling();
}

void ParseAuthnContextElement(NodeFilterIterator &iterator, AuthnContextType &context) {
  RequireNoAttributes(RequireElementQName(IteratorToElement(iterator), "AuthnContext", Namespaces::SAML));
  NodeFilterIterator child = iterator.GetChild();
  RequireNoAttributes(RequireElementQName(IteratorToElement(child), "AuthnContextClassRef", Namespaces::SAML));
  RequireTextualContent(child, context.AuthnContextClassRef);
  RequireNoFurtherNode(child.MoveToSibling(), "Unexpected elements after AuthnContextClassRef");
  iterator.MoveToSibling();
}

void ParseAttributeStatementElement(NodeFilterIterator &iterator, AttributeStatementType &statement) {
  const ElementNode &element = RequireElementQName(IteratorToElement(iterator), "AttributeStatement", Namespaces::SAML);
  RequireNoAttributes(element);
  statement.attributes.reserve(CountPossibleAttributes(element));
  NodeFilterIterator child = iterator.GetChild();
  while (child.node) {
    ParseAttributeElement(child, statement.attributes.emplace_back());
  }
  iterator.MoveToSibling();
}

void ParseAttributeElement(NodeFilterIterator &iterator, AttributeType &attribute) {
  const ElementNode &element = RequireElementQName(IteratorToElement(iterator), "Attribute", Namespaces::SAML);
  RequireElementAttributesNames(element, {"Name"}, {"NameFormat", "FriendlyName"});
  attribute.Name = GetTextAttribute(element, "Name");
  attribute.NameFormat = GetTextAttribute(element, "NameFormat");
  attribute.FriendlyName = GetTextAttribute(element, "FriendlyName");
  NodeFilterIterator child = iterator.GetChild();
  while (child.node) {
    ParseAttributeValue(child, attribute.values.emplace_back());
  }
  iterator.MoveToSibling();
}

} // namespace SsoClient
