// SPDX-License-Identifier: Apache-2.0

#include "token/statement_parser.h"

#include "model/namespaces.h"
#include "xml/expected_element.h"
#include "xml/qualified_name.h"
#include "xml/strict_checks.h"

#include <string>
#include <utility>

namespace SsoClient {

using Tarvel::Xml::ElementNode;

namespace {

bool ParseAttributeValue(NodeFilterIterator &iterator, std::string &value, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "AttributeValue", Namespaces::SAML, sink);
  if (!taken.node) {
    return false;
  }
  // Services may state the type of a value. It is ignored: every value is read as text.
  const ElementNode &element = *IteratorToElement(taken);
  if (element.GetFirstAttribute()) {
    RequireElementAttributesQNames(element, {}, {XSI_TYPE}, sink);
  }
  return RequireTextualContent(taken, value, sink);
}

} // namespace

bool TryParseAdviceElement(NodeFilterIterator &iterator, boost::optional<AdviceType> &advice, DeviationSink &sink) {
  const ElementNode *const element = IteratorToElement(iterator);
  if (!ElementQNameIs(element, "Advice", Namespaces::SAML)) {
    return false;
  }
  RequireNoAttributes(*element, sink);
  advice.emplace();
  NodeFilterIterator child = iterator.GetChild();
  while (child.node) {
    if (!ParseRsaAdviceElement(child, advice->advice.emplace_back(), sink)) {
      advice->advice.pop_back();
    }
  }
  iterator.MoveToSibling();
  return true;
}

bool ParseRsaAdviceElement(NodeFilterIterator &iterator, Advice &advice, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "RSAAdvice", Namespaces::RSA_SAML2, sink);
  if (!taken.node) {
    return false;
  }
  const ElementNode &element = *IteratorToElement(taken);
  RequireElementAttributesNames(element, {"AdviceSource"}, {}, sink);
  advice.source = GetTextAttribute(element, "AdviceSource");
  NodeFilterIterator child = taken.GetChild();
  while (child.node) {
    AttributeType attribute;
    if (ParseAttributeElement(child, attribute, sink)) {
      advice.attributes.push_back({std::move(attribute.Name), std::move(attribute.values)});
    }
  }
  return true;
}

void ParseAuthnStatementElement(NodeFilterIterator &iterator, AuthnStatementType &statement, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "AuthnStatement", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  const ElementNode &element = *IteratorToElement(taken);
  RequireElementAttributesNames(element, {"AuthnInstant"}, {}, sink);
  GetDateAttribute(element, "AuthnInstant", statement.AuthnInstant, sink);
  NodeFilterIterator child = taken.GetChild();
  ParseAuthnContextElement(child, statement.AuthnContext, sink);
  RequireNoFurtherNode(child, "Unexpected elements after AuthnContext", sink);
}

void ParseAuthnContextElement(NodeFilterIterator &iterator, AuthnContextType &context, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "AuthnContext", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  RequireNoAttributes(*IteratorToElement(taken), sink);
  NodeFilterIterator child = taken.GetChild();
  const NodeFilterIterator reference = TakeElement(child, "AuthnContextClassRef", Namespaces::SAML, sink);
  if (reference.node) {
    RequireNoAttributes(*IteratorToElement(reference), sink);
    RequireTextualContent(reference, context.AuthnContextClassRef, sink);
  }
  RequireNoFurtherNode(child, "Unexpected elements after AuthnContextClassRef", sink);
}

std::size_t CountPossibleAttributes(const ElementNode &statement) {
  std::size_t count = 0;
  for (const Tarvel::Xml::Node *child = statement.GetFirstChild(); child; child = child->GetNextSibling()) {
    const ElementNode *const element = Tarvel::Xml::AsElement(child);
    count += element && element->GetFirstAttribute() ? 1U : 0U;
  }
  return count;
}

void ParseAttributeStatementElement(NodeFilterIterator &iterator, AttributeStatementType &statement,
                                    DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "AttributeStatement", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  const ElementNode &element = *IteratorToElement(taken);
  RequireNoAttributes(element, sink);
  statement.attributes.reserve(CountPossibleAttributes(element));
  NodeFilterIterator child = taken.GetChild();
  while (child.node) {
    if (!ParseAttributeElement(child, statement.attributes.emplace_back(), sink)) {
      statement.attributes.pop_back();
    }
  }
}

bool ParseAttributeElement(NodeFilterIterator &iterator, AttributeType &attribute, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "Attribute", Namespaces::SAML, sink);
  if (!taken.node) {
    return false;
  }
  RequireElementAttributesNames(*IteratorToElement(taken), {"Name"}, {"NameFormat", "FriendlyName"}, sink);
  ReadAttributeNames(*IteratorToElement(taken), attribute);
  ReadAttributeValues(taken.GetChild(), attribute.values, ParseAttributeValue, sink);
  return true;
}

void ReadAttributeNames(const ElementNode &element, AttributeType &attribute) {
  attribute.element = &element;
  attribute.Name = GetTextAttribute(element, "Name");
  attribute.NameFormat = GetTextAttribute(element, "NameFormat");
  attribute.FriendlyName = GetTextAttribute(element, "FriendlyName");
}

void ReadAttributeValues(NodeFilterIterator iterator, std::vector<std::string> &values, AttributeValueParser parseValue,
                         DeviationSink &sink) {
  while (iterator.node) {
    if (!parseValue(iterator, values.emplace_back(), sink)) {
      values.pop_back();
    }
  }
}

} // namespace SsoClient
