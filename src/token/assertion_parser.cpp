// SPDX-License-Identifier: Apache-2.0

#include "token/assertion_parser.h"

#include "model/namespaces.h"
#include "token/conditions_parser.h"
#include "token/statement_parser.h"
#include "token/subject_parser.h"
#include "token/token_signature.h"
#include "xml/qualified_name.h"
#include "xml/strict_checks.h"
#include "xml/tree_walk.h"

namespace SsoClient {

using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

namespace {

/// Reads the attribute statement at the cursor, or an advice that is not in its place, and skips any other node.
void ReadAttributesOrAdvice(NodeFilterIterator &iterator, SamlAssertionType &assertion, DeviationSink &sink) {
  if (ElementQNameIs(IteratorToElement(iterator), "AttributeStatement", Namespaces::SAML)) {
    if (!assertion.AttributeStatement) {
      assertion.AttributeStatement.emplace();
    }
    ParseAttributeStatementElement(iterator, *assertion.AttributeStatement, sink);
  } else if (assertion.Advice || !TryParseAdviceElement(iterator, assertion.Advice, sink)) {
    iterator.MoveToSibling();
  }
}

void ParseStatements(NodeFilterIterator &iterator, SamlAssertionType &assertion, DeviationSink &sink) {
  NodeFilterIterator skipped = iterator;
  ParseAuthnStatementElement(iterator, assertion.AuthnStatement, sink);
  // Other issuers write the statements in another order.
  while (skipped.node != iterator.node) {
    ReadAttributesOrAdvice(skipped, assertion, sink);
  }
  for (bool isRead = false; iterator.node;) {
    if (isRead || !IteratorToElement(iterator)) {
      RefuseFurtherNode(iterator, "Unexpected elements under Assertion", sink);
    } else {
      isRead = RequireElementQName(iterator, "AttributeStatement", Namespaces::SAML, sink);
    }
    ReadAttributesOrAdvice(iterator, assertion, sink);
  }
}

void ParseAssertion(const NodeFilterIterator &iterator, const ElementNode &element, SamlAssertionType &assertion,
                    DeviationSink &sink) {
  RequireElementAttributesNames(element, {"Version", "ID", "IssueInstant"}, {}, sink);
  assertion.element = &element;
  assertion.Version = GetTextAttribute(element, "Version");
  assertion.ID = GetTextAttribute(element, "ID");
  GetDateAttribute(element, "IssueInstant", assertion.IssueInstant, sink);

  NodeFilterIterator child = iterator.GetChild();
  ParseSamlIssuerElement(child, assertion.Issuer, sink);
  ParseTokenSignature(child, element, assertion.Signature, sink);
  ParseSubjectElement(child, assertion.Subject, sink);
  ParseConditionsElement(child, assertion.Conditions, sink);
  TryParseAdviceElement(child, assertion.Advice, sink);
  ParseStatements(child, assertion, sink);
}

} // namespace

const ElementNode *FindAssertion(const Node *top) {
  const ElementNode *inOtherNamespace = nullptr;
  for (const Node *node = top; node; node = NextInTree(node, top)) {
    const ElementNode *const element = Tarvel::Xml::AsElement(node);
    if (ElementQNameIs(element, "Assertion", Namespaces::SAML)) {
      return element;
    }
    if (!inOtherNamespace && element && element->GetLocalName() == "Assertion") {
      inOtherNamespace = element;
    }
  }
  return inOtherNamespace;
}

void ParseSamlAssertionElement(NodeFilterIterator &iterator, SamlAssertionType &assertion, DeviationSink &sink) {
  const bool isAssertion = RequireElementQName(iterator, "Assertion", Namespaces::SAML, sink);
  const ElementNode *const element = isAssertion ? IteratorToElement(iterator) : FindAssertion(iterator.node);
  if (element) {
    ParseAssertion(NodeFilterIterator(element, iterator.filter), *element, assertion, sink);
  }
  iterator.MoveToSibling();
}

} // namespace SsoClient
