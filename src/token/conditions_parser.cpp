// SPDX-License-Identifier: Apache-2.0

#include "token/conditions_parser.h"

#include "token/subject_parser.h"
#include "xml/expected_element.h"
#include "xml/form_text.h"
#include "xml/refuse.h"
#include "xml/strict_checks.h"

#include <string>
#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Xml::ElementNode;

constexpr std::string_view RESTRICTIONS = "saml:AudienceRestriction, saml:ProxyRestriction, and saml:Condition of the "
                                          "types del:DelegationRestrictionType and "
                                          "rsa:RenewRestrictionType, each at most once";

/// The `saml:Condition` at the cursor if it has that type, otherwise null.
const ElementNode *ConditionOfType(const NodeFilterIterator &iterator, const QNameView &type, DeviationSink &sink) {
  const ElementNode *const element = IteratorToElement(iterator);
  return ElementQNameIs(element, "Condition", Namespaces::SAML) && ElementXsiTypeIs(*element, type, sink) ? element
                                                                                                          : nullptr;
}

void ParseAudience(NodeFilterIterator &iterator, std::set<std::string> &audiences, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "Audience", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  RequireNoAttributes(*IteratorToElement(taken), sink);
  std::string audience;
  if (RequireTextualContent(taken, audience, sink)) {
    audiences.insert(std::move(audience));
  }
}

/// Whether the condition at the cursor has a type with a prefix that is not bound. Such a prefix is reported here,
/// once: each comparison with a type that is not in `conditions` yet would report it again.
bool HasUnboundType(const NodeFilterIterator &iterator, const ConditionsType &conditions, DeviationSink &sink) {
  const ElementNode *const element = IteratorToElement(iterator);
  if (!ElementQNameIs(element, "Condition", Namespaces::SAML) ||
      (conditions.DelegationRestriction && conditions.RenewRestriction)) {
    return false;
  }
  const Tarvel::Xml::Attribute *const type = element->FindAttribute(XSI_TYPE.namespaceUri, XSI_TYPE.localName);
  return type && !ResolveXsiType(*element, *type, sink);
}

/// Reads the restriction at the cursor if its kind is known and not yet in `conditions`.
bool TryParseRestriction(NodeFilterIterator &iterator, ConditionsType &conditions, DeviationSink &sink) {
  return (!conditions.DelegationRestriction &&
          TryParseDelegationRestriction(iterator, conditions.DelegationRestriction, sink)) ||
         (!conditions.AudienceRestriction &&
          TryParseAudienceRestriction(iterator, conditions.AudienceRestriction, sink)) ||
         (!conditions.ProxyRestriction && TryParseProxyRestriction(iterator, conditions.ProxyRestriction, sink)) ||
         (!conditions.RenewRestriction && TryParseRenewRestriction(iterator, conditions.RenewRestriction, sink));
}

void RefuseRestriction(const NodeFilterIterator &iterator, DeviationSink &sink) {
  constexpr std::string_view MESSAGE = "Unknown or duplicate restriction node under Conditions";
  const WhatIsAt found{iterator.node};
  if (const ElementNode *const element = IteratorToElement(iterator)) {
    Refuse(sink, iterator, RESTRICTIONS, found, "%1: %2", MESSAGE, element->GetName());
  } else {
    Refuse(sink, iterator, RESTRICTIONS, found, MESSAGE);
  }
}

/// Skips a restriction that was refused. Its audiences are kept, because a reader of a report looks for them.
void SkipRestriction(NodeFilterIterator &iterator, ConditionsType &conditions, DeviationSink &sink) {
  boost::optional<AudienceRestrictionType> further;
  if (TryParseAudienceRestriction(iterator, further, sink)) {
    conditions.AudienceRestriction->audiences.merge(further->audiences);
  } else {
    iterator.MoveToSibling();
  }
}

} // namespace

void ParseConditionsElement(NodeFilterIterator &iterator, ConditionsType &conditions, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "Conditions", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  const ElementNode &element = *IteratorToElement(taken);
  RequireElementAttributesNames(element, {"NotBefore", "NotOnOrAfter"}, {}, sink);
  conditions.element = &element;
  GetDateAttribute(element, "NotBefore", conditions.NotBefore, sink);
  GetDateAttribute(element, "NotOnOrAfter", conditions.NotOnOrAfter, sink);

  NodeFilterIterator child = taken.GetChild();
  while (child.node) {
    if (HasUnboundType(child, conditions, sink)) {
      child.MoveToSibling();
    } else if (!TryParseRestriction(child, conditions, sink)) {
      RefuseRestriction(child, sink);
      SkipRestriction(child, conditions, sink);
    }
  }
}

bool TryParseDelegationRestriction(NodeFilterIterator &iterator,
                                   boost::optional<DelegationRestrictionType> &restriction, DeviationSink &sink,
                                   DelegateParser parseDelegate) {
  const ElementNode *const element = ConditionOfType(iterator, DELEGATION_RESTRICTION_TYPE, sink);
  if (!element) {
    return false;
  }
  RequireElementAttributesQNames(*element, {XSI_TYPE}, {}, sink);
  restriction.emplace();
  NodeFilterIterator child = iterator.GetChild();
  do {
    if (!parseDelegate(child, restriction->delegates.emplace_back(), sink)) {
      restriction->delegates.pop_back();
    }
  } while (child.node);
  iterator.MoveToSibling();
  return true;
}

bool ParseDelegate(NodeFilterIterator &iterator, DelegateType &delegate, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "Delegate", Namespaces::DELEGATION, sink);
  if (!taken.node) {
    return false;
  }
  const ElementNode &element = *IteratorToElement(taken);
  RequireElementAttributesNames(element, {"DelegationInstant"}, {}, sink);
  GetDateAttribute(element, "DelegationInstant", delegate.DelegationInstant, sink);
  NodeFilterIterator child = taken.GetChild();
  ParseSubjectNameIdElement(child, delegate.NameID, sink);
  RequireNoFurtherNode(child, "Unexpected elements after Delegate/NameID", sink);
  return true;
}

bool TryParseAudienceRestriction(NodeFilterIterator &iterator, boost::optional<AudienceRestrictionType> &restriction,
                                 DeviationSink &sink) {
  const ElementNode *const element = IteratorToElement(iterator);
  if (!ElementQNameIs(element, "AudienceRestriction", Namespaces::SAML)) {
    return false;
  }
  RequireNoAttributes(*element, sink);
  restriction.emplace();
  NodeFilterIterator child = iterator.GetChild();
  do {
    ParseAudience(child, restriction->audiences, sink);
  } while (child.node);
  iterator.MoveToSibling();
  return true;
}

bool TryParseProxyRestriction(NodeFilterIterator &iterator, boost::optional<ProxyRestrictionType> &restriction,
                              DeviationSink &sink) {
  const ElementNode *const element = IteratorToElement(iterator);
  if (!ElementQNameIs(element, "ProxyRestriction", Namespaces::SAML)) {
    return false;
  }
  RequireElementAttributesNames(*element, {}, {"Count"}, sink);
  restriction.emplace();
  GetULongOptionalAttribute(*element, "Count", restriction->Count, sink);
  RequireEmptyElement(iterator, sink);
  iterator.MoveToSibling();
  return true;
}

bool TryParseRenewRestriction(NodeFilterIterator &iterator, boost::optional<RenewRestrictionType> &restriction,
                              DeviationSink &sink) {
  const ElementNode *const element = ConditionOfType(iterator, RENEW_RESTRICTION_TYPE, sink);
  if (!element) {
    return false;
  }
  RequireElementAttributesQNames(*element, {XSI_TYPE},
                                 {LocalName("Count"), LocalName("Postdatable"), LocalName("RenewExpired")}, sink);
  restriction.emplace();
  GetULongOptionalAttribute(*element, "Count", restriction->Count, sink);
  // Content is refused, because it would be signed but ignored.
  RequireEmptyElement(iterator, sink);
  iterator.MoveToSibling();
  return true;
}

} // namespace SsoClient
