// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_statement_parser.h"

#include "token/saml2_form.h"
#include "token/statement_parser.h"
#include "token/token_facts.h"
#include "xml/expected_element.h"
#include "xml/form_text.h"
#include "xml/refuse.h"
#include "xml/strict_checks.h"

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Xml::ElementNode;

constexpr std::string_view STATEMENTS = "saml:AuthnStatement, saml:AttributeStatement";

/// Reads a value that must be one text.
bool ParseTextValue(NodeFilterIterator &iterator, std::string &value, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "AttributeValue", Namespaces::SAML, sink);
  return taken.node && RequireTextualContent(taken, value, sink);
}

/// Reads a value that may be anything. Returns whether it is a text.
bool ParseAnyValue(NodeFilterIterator &iterator, std::string &value, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "AttributeValue", Namespaces::SAML, sink);
  if (!taken.node) {
    return false;
  }
  NodeFilterIterator child = taken.GetChild();
  const bool isEmpty = !child.node;
  while (child.node && !IteratorToElement(child)) {
    child.MoveToSibling();
  }
  const bool isXml = child.node;
  return !isEmpty && !isXml && RequireTextualContent(taken, value, sink);
}

/// Groups and the solution flag decide about access, so each of their values must be a text.
AttributeValueParser FindValueParser(const AttributeType &attribute) {
  return SamlAttributeIsGroupIdentity(attribute) || SamlAttributeIsSolution(attribute) ? ParseTextValue : ParseAnyValue;
}

void ParseAttribute(NodeFilterIterator &iterator, AttributeStatementType &statement, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "Attribute", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  const ElementNode &element = *IteratorToElement(taken);
  RequireSchemaAttributes(element, {SamlType("AttributeType")}, {LocalName("Name")},
                          {LocalName("NameFormat"), LocalName("FriendlyName")}, sink, ForeignAttributes::IGNORED);
  AttributeType &attribute = statement.attributes.emplace_back();
  ReadAttributeNames(element, attribute);
  ReadAttributeValues(taken.GetChild(), attribute.values, FindValueParser(attribute), sink);
}

void ParseAttributeStatement(NodeFilterIterator &iterator, boost::optional<AttributeStatementType> &statement,
                             DeviationSink &sink) {
  RequireSchemaAttributes(*IteratorToElement(iterator), {SamlType("AttributeStatementType")}, {}, {}, sink);
  if (!statement) {
    statement.emplace();
    // Reserves memory for all statements: if it grew with each of them, all attributes would be copied each time.
    std::size_t count = 0;
    for (NodeFilterIterator sibling = iterator; sibling.node; sibling.MoveToSibling()) {
      count += IsSamlElement(sibling, "AttributeStatement") ? CountPossibleAttributes(*IteratorToElement(sibling)) : 0;
    }
    statement->attributes.reserve(count);
  }
  for (NodeFilterIterator child = iterator.GetChild(); child.node;) {
    if (!TryRefuseUnsupported(child, sink)) {
      ParseAttribute(child, *statement, sink);
    }
  }
  iterator.MoveToSibling();
}

void ParseLocality(NodeFilterIterator &iterator, AuthnStatementDetails &statement, DeviationSink &sink) {
  const ElementNode &element = *IteratorToElement(iterator);
  RequireSchemaAttributes(element, {SamlType("SubjectLocalityType")}, {}, {LocalName("Address"), LocalName("DNSName")},
                          sink);
  RequireEmptyElement(iterator, sink);
  statement.localityAddress = ReadOptionalText(element, "Address");
  statement.localityDnsName = ReadOptionalText(element, "DNSName");
  iterator.MoveToSibling();
}

/// Reads an element with a URI, if one of that name is at the cursor.
void TryParseReference(NodeFilterIterator &iterator, std::string_view localName, boost::optional<std::string> &uri,
                       DeviationSink &sink) {
  std::string read;
  if (IsSamlElement(iterator, localName) && ParseUriElement(iterator, localName, read, sink)) {
    uri = std::move(read);
  }
}

/// Reads the class of a context, its declaration, or both. The content of a declaration is ignored.
void ParseClassAndDeclaration(NodeFilterIterator &iterator, AuthnStatementDetails &statement, DeviationSink &sink) {
  const Tarvel::Xml::Node *const first = iterator.node;
  TryParseReference(iterator, "AuthnContextClassRef", statement.contextClass, sink);
  if (IsSamlElement(iterator, "AuthnContextDecl")) {
    iterator.MoveToSibling();
  } else {
    TryParseReference(iterator, "AuthnContextDeclRef", statement.contextDeclaration, sink);
  }
  if (iterator.node == first) {
    RequireElementQName(iterator, "AuthnContextClassRef", Namespaces::SAML, sink);
  }
}

void ParseContext(NodeFilterIterator &iterator, AuthnStatementDetails &statement, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "AuthnContext", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  RequireSchemaAttributes(*IteratorToElement(taken), {SamlType("AuthnContextType")}, {}, {}, sink);
  NodeFilterIterator child = taken.GetChild();
  ParseClassAndDeclaration(child, statement, sink);
  while (child.node) {
    std::string authority;
    if (ParseUriElement(child, "AuthenticatingAuthority", authority, sink)) {
      statement.authenticatingAuthorities.push_back(std::move(authority));
    }
  }
}

void ParseAuthnStatement(NodeFilterIterator &iterator, TokenDetails &details, DeviationSink &sink) {
  if (RequireRoomForElement(iterator, details.authnStatements.size(), sink)) {
    const ElementNode &element = *IteratorToElement(iterator);
    RequireSchemaAttributes(element, {SamlType("AuthnStatementType")}, {LocalName("AuthnInstant")},
                            {LocalName("SessionIndex"), LocalName("SessionNotOnOrAfter")}, sink);
    AuthnStatementDetails &statement = details.authnStatements.emplace_back();
    GetDateAttribute(element, "AuthnInstant", statement.authnInstant, sink);
    statement.sessionIndex = ReadOptionalText(element, "SessionIndex");
    statement.sessionNotOnOrAfter = ReadOptionalDate(element, "SessionNotOnOrAfter", sink);
    NodeFilterIterator child = iterator.GetChild();
    if (IsSamlElement(child, "SubjectLocality")) {
      ParseLocality(child, statement, sink);
    }
    ParseContext(child, statement, sink);
    RefuseFurtherContent(child, sink);
  }
  iterator.MoveToSibling();
}

void RefuseStatement(NodeFilterIterator &iterator, DeviationSink &sink) {
  if (!IsSamlElement(iterator, "AuthzDecisionStatement") && !IsSamlElement(iterator, "Statement")) {
    RefuseContent(iterator, STATEMENTS, sink);
    return;
  }
  Refuse(sink, iterator, STATEMENTS, WhatIsAt{iterator.node}, "A statement of this kind is not supported: '%1'",
         IteratorToElement(iterator)->GetName());
  iterator.MoveToSibling();
}

} // namespace

void TryParseSaml2AdviceElement(NodeFilterIterator &iterator, boost::optional<AdviceType> &advice,
                                DeviationSink &sink) {
  if (!IsSamlElement(iterator, "Advice")) {
    return;
  }
  RequireSchemaAttributes(*IteratorToElement(iterator), {SamlType("AdviceType")}, {}, {}, sink);
  advice.emplace();
  for (NodeFilterIterator child = iterator.GetChild(); child.node;) {
    const ElementNode *const element = IteratorToElement(child);
    if (!element) {
      RefuseContent(child, "elements", sink);
    } else if (!ElementQNameIs(element, "RSAAdvice", Namespaces::RSA_SAML2)) {
      child.MoveToSibling();
    } else {
      ParseRsaAdviceElement(child, advice->advice.emplace_back(), sink);
    }
  }
  iterator.MoveToSibling();
}

void ParseSaml2Statements(NodeFilterIterator &iterator, Saml2Assertion &assertion, DeviationSink &sink) {
  while (iterator.node) {
    if (IsSamlElement(iterator, "AuthnStatement")) {
      ParseAuthnStatement(iterator, assertion.details, sink);
    } else if (IsSamlElement(iterator, "AttributeStatement")) {
      ParseAttributeStatement(iterator, assertion.common.AttributeStatement, sink);
    } else {
      RefuseStatement(iterator, sink);
    }
  }
}

} // namespace SsoClient
