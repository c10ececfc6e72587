// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_conditions_parser.h"

#include "token/conditions_parser.h"
#include "token/saml2_form.h"
#include "token/saml2_subject_parser.h"
#include "xml/expected_element.h"
#include "xml/form_text.h"
#include "xml/refuse.h"
#include "xml/strict_checks.h"

#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Xml::ElementNode;

constexpr std::string_view CONDITIONS =
    "saml:AudienceRestriction, saml:OneTimeUse, saml:ProxyRestriction, and saml:Condition of the types "
    "del:DelegationRestrictionType and rsa:RenewRestrictionType";

void ParseAudience(NodeFilterIterator &iterator, std::set<std::string> &audiences, DeviationSink &sink) {
  std::string audience;
  if (ParseUriElement(iterator, "Audience", audience, sink)) {
    audiences.insert(std::move(audience));
  }
}

void ParseAudienceRestriction(NodeFilterIterator &iterator, TokenDetails &details, DeviationSink &sink) {
  if (RequireRoomForElement(iterator, details.audienceRestrictions.size(), sink)) {
    RequireSchemaAttributes(*IteratorToElement(iterator), {SamlType("AudienceRestrictionType")}, {}, {}, sink);
    std::set<std::string> &audiences = details.audienceRestrictions.emplace_back();
    NodeFilterIterator child = iterator.GetChild();
    do {
      ParseAudience(child, audiences, sink);
    } while (child.node);
  }
  iterator.MoveToSibling();
}

void ParseOneTimeUse(NodeFilterIterator &iterator, TokenDetails &details, DeviationSink &sink) {
  RequireSchemaAttributes(*IteratorToElement(iterator), {SamlType("OneTimeUseType")}, {}, {}, sink);
  RequireEmptyElement(iterator, sink);
  details.isOneTimeUse = true;
  iterator.MoveToSibling();
}

void ParseProxyRestriction(NodeFilterIterator &iterator, Saml2Assertion &assertion, DeviationSink &sink) {
  const ElementNode &element = *IteratorToElement(iterator);
  RequireSchemaAttributes(element, {SamlType("ProxyRestrictionType")}, {}, {LocalName("Count")}, sink);
  ProxyDetails proxy;
  GetULongOptionalAttribute(element, "Count", proxy.count, sink);
  for (NodeFilterIterator child = iterator.GetChild(); child.node;) {
    ParseAudience(child, proxy.audiences, sink);
  }
  assertion.common.Conditions.ProxyRestriction = ProxyRestrictionType{proxy.count};
  assertion.details.proxyRestriction = std::move(proxy);
  iterator.MoveToSibling();
}

bool ParseSaml2Delegate(NodeFilterIterator &iterator, DelegateType &delegate, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "Delegate", Namespaces::DELEGATION, sink);
  if (!taken.node) {
    return false;
  }
  const ElementNode &element = *IteratorToElement(taken);
  RequireSchemaAttributes(element, {{Namespaces::DELEGATION, "DelegateType"}}, {LocalName("DelegationInstant")},
                          {LocalName("ConfirmationMethod")}, sink);
  GetDateAttribute(element, "DelegationInstant", delegate.DelegationInstant, sink);
  NodeFilterIterator child = taken.GetChild();
  if (!TryRefuseUnsupported(child, sink)) {
    NameId exact;
    ParseSaml2NameIdElement(child, delegate.NameID, exact, sink);
  }
  RefuseFurtherContent(child, sink);
  return true;
}

/// Refuses a `saml:Condition` whose type is `type`, and skips it.
void RefuseCondition(NodeFilterIterator &iterator, const std::optional<QNameView> &type, DeviationSink &sink) {
  const ElementNode &element = *IteratorToElement(iterator);
  if (type && (*type == DELEGATION_RESTRICTION_TYPE || *type == RENEW_RESTRICTION_TYPE)) {
    Refuse(sink, element, "at most one", *type, "Repeated condition: '%1'", *type);
  } else if (type) {
    Refuse(sink, element, CONDITIONS, *type, "Unknown condition, so the token is indeterminate: '%1'", *type);
  } else {
    Refuse(sink, element, CONDITIONS, "no xsi:type", "Condition without a type, so the token is indeterminate: '%1'",
           element.GetName());
  }
  iterator.MoveToSibling();
}

/// Reads a `saml:Condition`.
void ParseCondition(NodeFilterIterator &iterator, ConditionsType &conditions, DeviationSink &sink) {
  const ElementNode &element = *IteratorToElement(iterator);
  const Tarvel::Xml::Attribute *const written = element.FindAttribute(XSI_TYPE.namespaceUri, XSI_TYPE.localName);
  const std::optional<QNameView> type = written ? ResolveXsiType(element, *written, sink) : std::nullopt;
  if (written && !type) {
    iterator.MoveToSibling(); // the prefix of the type is not bound, which has been reported
  } else if (type == DELEGATION_RESTRICTION_TYPE && !conditions.DelegationRestriction) {
    TryParseDelegationRestriction(iterator, conditions.DelegationRestriction, sink, ParseSaml2Delegate);
  } else if (type == RENEW_RESTRICTION_TYPE && !conditions.RenewRestriction) {
    TryParseRenewRestriction(iterator, conditions.RenewRestriction, sink);
  } else {
    RefuseCondition(iterator, type, sink);
  }
}

void ParseRestriction(NodeFilterIterator &iterator, Saml2Assertion &assertion, DeviationSink &sink) {
  const bool isOneTimeUse = IsSamlElement(iterator, "OneTimeUse");
  const bool isProxy = IsSamlElement(iterator, "ProxyRestriction");
  if ((isOneTimeUse && assertion.details.isOneTimeUse) || (isProxy && assertion.details.proxyRestriction)) {
    RefuseRepeated(iterator, sink);
  } else if (isOneTimeUse) {
    ParseOneTimeUse(iterator, assertion.details, sink);
  } else if (isProxy) {
    ParseProxyRestriction(iterator, assertion, sink);
  } else if (IsSamlElement(iterator, "AudienceRestriction")) {
    ParseAudienceRestriction(iterator, assertion.details, sink);
  } else if (IsSamlElement(iterator, "Condition")) {
    ParseCondition(iterator, assertion.common.Conditions, sink);
  } else {
    RefuseContent(iterator, CONDITIONS, sink);
  }
}

} // namespace

void ParseSaml2ConditionsElement(NodeFilterIterator &iterator, Saml2Assertion &assertion, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "Conditions", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  const ElementNode &element = *IteratorToElement(taken);
  RequireSchemaAttributes(element, {SamlType("ConditionsType")}, {LocalName("NotOnOrAfter")}, {LocalName("NotBefore")},
                          sink);
  ConditionsType &conditions = assertion.common.Conditions;
  conditions.element = &element;
  if (element.FindAttribute(std::string_view(), "NotBefore")) {
    GetDateAttribute(element, "NotBefore", conditions.NotBefore, sink);
  } else {
    conditions.NotBefore = assertion.common.IssueInstant;
  }
  GetDateAttribute(element, "NotOnOrAfter", conditions.NotOnOrAfter, sink);
  for (NodeFilterIterator child = taken.GetChild(); child.node;) {
    ParseRestriction(child, assertion, sink);
  }
}

} // namespace SsoClient
