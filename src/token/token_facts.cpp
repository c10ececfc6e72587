// SPDX-License-Identifier: Apache-2.0

#include "token/token_facts.h"

#include "xml/refuse.h"

#include <tarvel/core/string_util.h>

#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

constexpr std::string_view GROUP_IDENTITY = SSOCLIENT_EXTENSION_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity";
constexpr std::string_view IS_SOLUTION = SSOCLIENT_SOLUTION_AUTHORITY "/schemas/attr-names/2011/07/isSolution";
constexpr std::string_view GIVEN_NAME = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname";
constexpr std::string_view SUR_NAME = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname";

/// Whether there is text before and after `separator`, a position in `text` or npos.
bool HasBothSides(const std::string &text, std::size_t separator) {
  return separator != std::string::npos && separator != 0 && separator + 1 != text.size();
}

/// Whether a restriction allows at least one more use. Without a number it allows no use.
template <typename Restriction>
bool Allows(const boost::optional<Restriction> &restriction) {
  return restriction && restriction->Count && *restriction->Count != 0;
}

/// In the profile SAML2, a group may be a name without a domain.
bool ParseGroup(std::string &&value, TokenProfile profile, PrincipalId &group, const Tarvel::Xml::ElementNode *place,
                DeviationSink &sink) {
  if (profile == TokenProfile::SAML2 && !value.empty() && value.find('\\') == std::string::npos) {
    group.name = std::move(value);
    return true;
  }
  return ParseGroupIdentity(std::move(value), group, place, sink);
}

void TakeGroups(AttributeType &attribute, TokenProfile profile, TokenFacts &facts, DeviationSink &sink) {
  if (facts.groups.empty()) { // reserving for each attribute would copy all groups each time
    facts.groups.reserve(attribute.values.size());
  }
  for (std::string &value : attribute.values) {
    if (!ParseGroup(std::move(value), profile, facts.groups.emplace_back(), attribute.element, sink)) {
      facts.groups.pop_back();
    }
  }
}

void PopulateTokenAttribute(AttributeType &attribute, TokenProfile profile, TokenFacts &facts, DeviationSink &sink) {
  if (SamlAttributeIsGroupIdentity(attribute)) {
    TakeGroups(attribute, profile, facts, sink);
  } else if (SamlAttributeIsSolution(attribute)) {
    ParseIsSolutionAttribute(attribute, facts.solution, sink);
  } else if (SamlAttributeIsGivenName(attribute)) {
    facts.fullName.first = ParsePrincipalNameAttribute(attribute);
  } else if (SamlAttributeIsSurName(attribute)) {
    facts.fullName.second = ParsePrincipalNameAttribute(attribute);
  }
}

} // namespace

TokenFacts TakeTokenFacts(SamlAssertionType &&assertion) {
  TokenFacts facts;
  DeviationSink &sink = ThrowingSink();
  TakeSubject(assertion, facts, sink);
  TakeAttributes(assertion, facts, sink);
  TakeConditions(assertion.Conditions, facts, sink);
  return facts;
}

void TakeSubject(SamlAssertionType &assertion, TokenFacts &facts, DeviationSink &sink) {
  facts.id = std::move(assertion.ID);
  ParseSamlNameId(assertion.Subject.NameID, facts.subject, sink);
  facts.confirmationMethod = assertion.Subject.SubjectConfirmation.Method;
  facts.confirmationCertificate = std::move(assertion.Subject.SubjectConfirmation.SubjectConfirmationData.certificate);
}

void TakeAttributes(SamlAssertionType &assertion, TokenFacts &facts, DeviationSink &sink, TokenProfile profile) {
  if (assertion.Advice) {
    facts.advice = std::move(assertion.Advice->advice);
  }
  if (assertion.AttributeStatement) {
    for (AttributeType &attribute : assertion.AttributeStatement->attributes) {
      PopulateTokenAttribute(attribute, profile, facts, sink);
    }
  }
}

void TakeConditions(ConditionsType &conditions, TokenFacts &facts, DeviationSink &sink) {
  facts.startDate = conditions.NotBefore;
  facts.endDate = conditions.NotOnOrAfter;
  TakePermissions(conditions, facts);
  if (conditions.DelegationRestriction) {
    for (const DelegateType &delegate : conditions.DelegationRestriction->delegates) {
      Delegate parsed;
      if (ParseToDelegate(delegate, parsed, sink)) {
        facts.delegationChain.push_back(std::move(parsed));
      }
    }
  }
  if (conditions.AudienceRestriction) {
    facts.audience = std::move(conditions.AudienceRestriction->audiences);
  }
}

void TakePermissions(const ConditionsType &conditions, TokenFacts &facts) {
  facts.renewable = Allows(conditions.RenewRestriction);
  facts.delegable = Allows(conditions.ProxyRestriction);
}

bool SamlAttributeIsGroupIdentity(const AttributeType &attribute) {
  return attribute.Name == GROUP_IDENTITY;
}

bool SamlAttributeIsSolution(const AttributeType &attribute) {
  return attribute.Name == IS_SOLUTION;
}

bool SamlAttributeIsGivenName(const AttributeType &attribute) {
  return attribute.Name == GIVEN_NAME;
}

bool SamlAttributeIsSurName(const AttributeType &attribute) {
  return attribute.Name == SUR_NAME;
}

PrincipalId ParseGroupIdentity(std::string value) {
  PrincipalId group;
  ParseGroupIdentity(std::move(value), group, nullptr, ThrowingSink());
  return group;
}

bool ParseGroupIdentity(std::string &&value, PrincipalId &group, const Tarvel::Xml::ElementNode *place,
                        DeviationSink &sink) {
  const std::size_t backslash = value.find('\\');
  if (!HasBothSides(value, backslash)) {
    Refuse(sink, place, "domain\\group", value, "Failed to parse Group Identity value: `%1'; domain or group missing",
           value);
    return false;
  }
  group.domain.assign(value, 0, backslash);
  value.erase(0, backslash + 1);
  group.name = std::move(value);
  return true;
}

PrincipalId ParseSamlNameId(const NameIDType &nameId) {
  PrincipalId principal;
  ParseSamlNameId(nameId, principal, ThrowingSink());
  return principal;
}

bool ParseSamlNameId(const NameIDType &nameId, PrincipalId &principal, DeviationSink &sink) {
  if (nameId.Format != FORMAT_UPN) {
    Refuse(sink, {nameId.element, "Format"}, FORMAT_UPN, nameId.Format, "Invalid or unsupported NameId format '%1'",
           nameId.Format);
    return false;
  }
  if (!SplitUserPrincipalName(nameId.value, principal)) {
    Refuse(sink, nameId.element, "name@domain", nameId.value,
           "Failed to parse the UPN NameID: `%1'; name or domain part is missing.", nameId.value);
    return false;
  }
  return true;
}

bool SplitUserPrincipalName(const std::string &text, PrincipalId &principal) {
  const std::size_t atSign = text.rfind('@');
  if (!HasBothSides(text, atSign)) {
    return false;
  }
  principal = {text.substr(0, atSign), text.substr(atSign + 1)};
  return true;
}

bool ParseIsSolutionAttribute(const AttributeType &attribute) {
  bool isSolution = false;
  ParseIsSolutionAttribute(attribute, isSolution, ThrowingSink());
  return isSolution;
}

bool ParseIsSolutionAttribute(const AttributeType &attribute, bool &isSolution, DeviationSink &sink) {
  if (attribute.values.size() != 1) {
    Refuse(sink, attribute.element, "one value", attribute.values.size(),
           attribute.values.empty() ? "No value found for attribute isSolution."
                                    : "More than one value found for attribute isSolution.");
    return false;
  }
  isSolution = Tarvel::StringUtil::ToLower(attribute.values.front()) == "true";
  return true;
}

std::string ParsePrincipalNameAttribute(const AttributeType &attribute) {
  return attribute.values.empty() ? std::string() : attribute.values.front();
}

Delegate ParseToDelegate(const DelegateType &delegate) {
  Delegate parsed;
  ParseToDelegate(delegate, parsed, ThrowingSink());
  return parsed;
}

bool ParseToDelegate(const DelegateType &delegate, Delegate &parsed, DeviationSink &sink) {
  parsed.delegationInstant = delegate.DelegationInstant;
  return ParseSamlNameId(delegate.NameID, parsed.subject, sink);
}

} // namespace SsoClient
