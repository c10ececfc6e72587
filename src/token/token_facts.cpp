// SPDX-License-Identifier: Apache-2.0

#include "token/token_facts.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/message_formatter.h>
#include <tarvel/core/string_util.h>

#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::MessageFormatter;

constexpr std::string_view GROUP_IDENTITY = SSOCLIENT_EXTENSION_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity";
constexpr std::string_view IS_SOLUTION = SSOCLIENT_SOLUTION_AUTHORITY "/schemas/attr-names/2011/07/isSolution";
constexpr std::string_view GIVEN_NAME = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname";
constexpr std::string_view SUR_NAME = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname";
constexpr std::string_view FORMAT_UPN = "http://schemas.xmlsoap.org/claims/UPN";

/// Whether there is text before and after `separator`, a position in `text` or npos.
bool HasBothSides(const std::string &text, std::size_t separator) {
  return separator != std::string::npos && separator != 0 && separator + 1 != text.size();
}

/// Whether a restriction allows at least one more use. Without a number it allows no use.
template <typename Restriction>
bool Allows(const boost::optional<Restriction> &restriction) {
  return restriction && restriction->Count && *restriction->Count != 0;
}

void TakeConditions(ConditionsType &conditions, TokenFacts &facts) {
  facts.startDate = conditions.NotBefore;
  facts.endDate = conditions.NotOnOrAfter;
  facts.renewable = Allows(conditions.RenewRestriction);
  facts.delegable = Allows(conditions.ProxyRestriction);
  if (conditions.DelegationRestriction) {
    for (const DelegateType &delegate : conditions.DelegationRestriction->delegates) {
      facts.delegationChain.push_back(ParseToDelegate(delegate));
    }
  }
  if (conditions.AudienceRestriction) {
    facts.audience = std::move(conditions.AudienceRestriction->audiences);
  }
}

void PopulateTokenAttribute(AttributeType &attribute, TokenFacts &facts) {
  if (SamlAttributeIsGroupIdentity(attribute)) {
    if (facts.groups.empty()) { // reserving for each attribute would copy all groups each time
      facts.groups.reserve(attribute.values.size());
    }
    for (std::string &value : attribute.values) {
      facts.groups.push_back(ParseGroupIdentity(std::move(value)));
    }
  } else if (SamlAttributeIsSolution(attribute)) {
    facts.solution = ParseIsSolutionAttribute(attribute);
  } else if (SamlAttributeIsGivenName(attribute)) {
    facts.fullName.first = ParsePrincipalNameAttribute(attribute);
  } else if (SamlAttributeIsSurName(attribute)) {
    facts.fullName.second = ParsePrincipalNameAttribute(attribute);
  }
}

} // namespace

TokenFacts TakeTokenFacts(SamlAssertionType &&assertion) {
  TokenFacts facts;
  facts.id = std::move(assertion.ID);
  facts.subject = ParseSamlNameId(assertion.Subject.NameID);
  facts.confirmationMethod = assertion.Subject.SubjectConfirmation.Method;
  facts.confirmationCertificate = std::move(assertion.Subject.SubjectConfirmation.SubjectConfirmationData.certificate);
  if (assertion.Advice) {
    facts.advice = std::move(assertion.Advice->advice);
  }
  if (assertion.AttributeStatement) {
    for (AttributeType &attribute : assertion.AttributeStatement->attributes) {
      PopulateTokenAttribute(attribute, facts);
    }
  }
  TakeConditions(assertion.Conditions, facts);
  return facts;
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
  const std::size_t backslash = value.find('\\');
  if (!HasBothSides(value, backslash)) {
    throw ParseException(
        MessageFormatter::ASPrint("Failed to parse Group Identity value: `%1'; domain or group missing", value));
  }
  std::string domain = value.substr(0, backslash);
  value.erase(0, backslash + 1);
  return {std::move(value), std::move(domain)};
}

PrincipalId ParseSamlNameId(const NameIDType &nameId) {
  if (nameId.Format != FORMAT_UPN) {
    throw ParseException(MessageFormatter::ASPrint("Invalid or unsupported NameId format '%1'", nameId.Format));
  }
  const std::size_t atSign = nameId.value.rfind('@');
  if (!HasBothSides(nameId.value, atSign)) {
    throw ParseException(MessageFormatter::ASPrint(
        "Failed to parse the UPN NameID: `%1'; name or domain part is missing.", nameId.value));
  }
  return {nameId.value.substr(0, atSign), nameId.value.substr(atSign + 1)};
}

bool ParseIsSolutionAttribute(const AttributeType &attribute) {
  if (attribute.values.empty()) {
    throw ParseException("No value found for attribute isSolution.");
  }
  if (attribute.values.size() > 1) {
    throw ParseException("More than one value found for attribute isSolution.");
  }
  return Tarvel::StringUtil::ToLower(attribute.values.front()) == "true";
}

std::string ParsePrincipalNameAttribute(const AttributeType &attribute) {
  return attribute.values.empty() ? std::string() : attribute.values.front();
}

Delegate ParseToDelegate(const DelegateType &delegate) {
  return {ParseSamlNameId(delegate.NameID), delegate.DelegationInstant};
}

} // namespace SsoClient
