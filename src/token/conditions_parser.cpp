// SPDX-License-Identifier: Apache-2.0

#include "token/conditions_parser.h"

#include "model/namespaces.h"
#include "token/subject_parser.h"
#include "xml/qualified_name.h"
#include "xml/strict_checks.h"

#include <ssoclient/exceptions.h>

#include <string>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Xml::ElementNode;

constexpr QNameView DELEGATION_RESTRICTION_TYPE(Namespaces::DELEGATION, "DelegationRestrictionType");
constexpr QNameView RENEW_RESTRICTION_TYPE(Namespaces::RSA_SAML2, "RenewRestrictionType");

/// The `saml:Condition` at the cursor if it has that type, otherwise null.
const ElementNode *ConditionOfType(const NodeFilterIterator &iterator, const QNameView &type) {
  const ElementNode *const element = IteratorToElement(iterator);
  return ElementQNameIs(element, "Condition", Namespaces::SAML) && ElementXsiTypeIs(*element, type) ? element : nullptr;
}

void ParseAudience(NodeFilterIterator &iterator, std::set<std::string> &audiences) {
  RequireNoAttributes(RequireElementQName(IteratorToElement(iterator), "Audience", Namespaces::SAML));
  std::string audience;
  RequireTextualContent(iterator, audience);
  audiences.insert(std::move(audience));
  iterator.MoveToSibling();
}

/// Reads the restriction at the cursor if its kind is known and not yet in `conditions`.
bool TryParseRestriction(NodeFilterIterator &iterator, ConditionsType &conditions) {
  return (!conditions.DelegationRestriction &&
          TryParseDelegationRestriction(iterator, conditions.DelegationRestriction)) ||
         (!conditions.AudienceRestriction && TryParseAudienceRestriction(iterator, conditions.AudienceRestriction)) ||
         (!conditions.ProxyRestriction && TryParseProxyRestriction(iterator, conditions.ProxyRestriction)) ||
         (!conditions.RenewRestriction && TryParseRenewRestriction(iterator, conditions.RenewRestriction));
}

[[noreturn]] void RefuseRestriction(const ElementNode *element) {
  std::string message = "Unknown or duplicate restriction node under Conditions";
  if (element) {
    message.append(": ").append(element->GetName());
  }
  throw ParseException(message);
}

} // namespace

void ParseConditionsElement(NodeFilterIterator &iterator, ConditionsType &conditions) {
  const ElementNode &element = RequireElementQName(IteratorToElement(iterator), "Conditions", Namespaces::SAML);
  RequireElementAttributesNames(element, {"NotBefore", "NotOnOrAfter"}, {});
  GetDateAttribute(element, "NotBefore", conditions.NotBefore);
  GetDateAttribute(element, "NotOnOrAfter", conditions.NotOnOrAfter);

  NodeFilterIterator child = iterator.GetChild();
  while (child.node) {
    if (!TryParseRestriction(child, conditions)) {
      RefuseRestriction(IteratorToElement(child));
    }
  }
  iterator.MoveToSibling();
}

bool TryParseDelegationRestriction(NodeFilterIterator &iterator,
                                   boost::optional<DelegationRestrictionType> &restriction) {
  const ElementNode *const element = ConditionOfType(iterator, DELEGATION_RESTRICTION_TYPE);
  if (!element) {
    return false;
  }
  RequireElementAttributesQNames(*element, {XSI_TYPE}, {});
  restriction.emplace();
  NodeFilterIterator child = iterator.GetChild();
  do {
    ParseDelegate(child, restriction->delegates.emplace_back());
  } while (child.node);
  iterator.MoveToSibling();
  return true;
}

void ParseDelegate(NodeFilterIterator &iterator, DelegateType &delegate) {
  const ElementNode &element = RequireElementQName(IteratorToElement(iterator), "Delegate", Namespaces::DELEGATION);
  RequireElementAttributesNames(element, {"DelegationInstant"}, {});
  GetDateAttribute(element, "DelegationInstant", delegate.DelegationInstant);
  NodeFilterIterator child = iterator.GetChild();
  ParseSubjectNameIdElement(child, delegate.NameID);
  RequireNoFurtherNode(child, "Unexpected elements after Delegate/NameID");
  iterator.MoveToSibling();
}

bool TryParseAudienceRestriction(NodeFilterIterator &iterator, boost::optional<AudienceRestrictionType> &restriction) {
  const ElementNode *const element = IteratorToElement(iterator);
  if (!ElementQNameIs(element, "AudienceRestriction", Namespaces::SAML)) {
    return false;
  }
  RequireNoAttributes(*element);
  restriction.emplace();
  NodeFilterIterator child = iterator.GetChild();
  do {
    ParseAudience(child, restriction->audiences);
  } while (child.node);
  iterator.MoveToSibling();
  return true;
}

bool TryParseProxyRestriction(NodeFilterIterator &iterator, boost::optional<ProxyRestrictionType> &restriction) {
  const ElementNode *const element = IteratorToElement(iterator);
  if (!ElementQNameIs(element, "ProxyRestriction", Namespaces::SAML)) {
    return false;
  }
  RequireElementAttributesNames(*element, {}, {"Count"});
  restriction.emplace();
  GetULongOptionalAttribute(*element, "Count", restriction->Count);
  RequireEmptyElement(iterator);
  iterator.MoveToSibling();
  return true;
}

bool TryParseRenewRestriction(NodeFilterIterator &iterator, boost::optional<RenewRestrictionType> &restriction) {
  const ElementNode *const element = ConditionOfType(iterator, RENEW_RESTRICTION_TYPE);
  if (!element) {
    return false;
  }
  RequireElementAttributesQNames(*element, {XSI_TYPE},
                                 {LocalName("Count"), LocalName("Postdatable"), LocalName("RenewExpired")});
  restriction.emplace();
  GetULongOptionalAttribute(*element, "Count", restriction->Count);
  // Content is refused, because it would be signed but ignored.
  RequireEmptyElement(iterator);
  iterator.MoveToSibling();
  return true;
}

} // namespace SsoClient
