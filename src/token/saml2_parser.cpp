// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_parser.h"

#include "token/assertion_parser.h"
#include "token/saml2_conditions_parser.h"
#include "token/saml2_form.h"
#include "token/saml2_statement_parser.h"
#include "token/saml2_subject_parser.h"
#include "token/token_signature.h"
#include "xml/strict_checks.h"

namespace SsoClient {

namespace {

using Tarvel::Xml::ElementNode;

/// The assertion at the cursor. If another node is there, it is refused, and the result is that of `FindAssertion`.
const ElementNode *FindRoot(const NodeFilterIterator &iterator, DeviationSink &sink) {
  NodeFilterIterator next = iterator;
  const bool isEncrypted = IsSamlElement(iterator, "EncryptedAssertion") && TryRefuseUnsupported(next, sink);
  if (!isEncrypted && RequireElementQName(iterator, "Assertion", Namespaces::SAML, sink)) {
    return IteratorToElement(iterator);
  }
  return FindAssertion(iterator.node);
}

void ParseAssertion(const NodeFilterIterator &iterator, Saml2Assertion &assertion, DeviationSink &sink) {
  const ElementNode &element = *IteratorToElement(iterator);
  SamlAssertionType &common = assertion.common;
  RequireSchemaAttributes(element, {SamlType("AssertionType")},
                          {LocalName("Version"), LocalName("ID"), LocalName("IssueInstant")}, {}, sink);
  common.element = &element;
  common.Version = GetTextAttribute(element, "Version");
  common.ID = GetTextAttribute(element, "ID");
  GetDateAttribute(element, "IssueInstant", common.IssueInstant, sink);
  assertion.details.issueInstant = common.IssueInstant;

  NodeFilterIterator child = iterator.GetChild();
  ParseSaml2IssuerElement(child, common.Issuer, assertion.details.issuer, sink);
  ParseTokenSignature(child, element, common.Signature, sink);
  ParseSaml2SubjectElement(child, assertion, sink);
  ParseSaml2ConditionsElement(child, assertion, sink);
  TryParseSaml2AdviceElement(child, common.Advice, sink);
  ParseSaml2Statements(child, assertion, sink);
}

} // namespace

void ParseSaml2AssertionElement(NodeFilterIterator &iterator, Saml2Assertion &assertion, DeviationSink &sink) {
  if (const ElementNode *const element = FindRoot(iterator, sink)) {
    ParseAssertion(NodeFilterIterator(element, iterator.filter), assertion, sink);
  }
  iterator.MoveToSibling();
}

} // namespace SsoClient
