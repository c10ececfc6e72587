// SPDX-License-Identifier: Apache-2.0

#include "token/assertion_parser.h"

#include "model/namespaces.h"
#include "token/conditions_parser.h"
#include "token/statement_parser.h"
#include "token/subject_parser.h"
#include "token/token_signature.h"
#include "xml/strict_checks.h"

namespace SsoClient {

using Tarvel::Xml::ElementNode;

void ParseSamlAssertionElement(NodeFilterIterator &iterator, SamlAssertionType &assertion) {
  const ElementNode &element = RequireElementQName(IteratorToElement(iterator), "Assertion", Namespaces::SAML);
  RequireElementAttributesNames(element, {"Version", "ID", "IssueInstant"}, {});
  assertion.Version = GetTextAttribute(element, "Version");
  assertion.ID = GetTextAttribute(element, "ID");
  GetDateAttribute(element, "IssueInstant", assertion.IssueInstant);

  NodeFilterIterator child = iterator.GetChild();
  ParseSamlIssuerElement(child, assertion.Issuer);
  ParseTokenSignature(child, element, assertion.Signature);
  ParseSubjectElement(child, assertion.Subject);
  ParseConditionsElement(child, assertion.Conditions);
  TryParseAdviceElement(child, assertion.Advice);
  ParseAuthnStatementElement(child, assertion.AuthnStatement);
  if (IteratorToElement(child)) {
    assertion.AttributeStatement.emplace();
    ParseAttributeStatementElement(child, *assertion.AttributeStatement);
  }
  RequireNoFurtherNode(child, "Unexpected elements under Assertion");
  iterator.MoveToSibling();
}

} // namespace SsoClient
