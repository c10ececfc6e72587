// SPDX-License-Identifier: Apache-2.0

#include "token_issuer.h"

#include <openssl/rand.h>

#include <array>
#include <stdexcept>
#include <string_view>

namespace DevSts {

namespace {

constexpr const char *ISSUER = "https://localhost/sts";
constexpr const char *ATTRIBUTE_NAME_FORMAT = "urn:oasis:names:tc:SAML:2.0:attrname-format:uri";

std::string NewIdentifier() {
  std::array<unsigned char, 16> bytes{};
  if (RAND_bytes(bytes.data(), bytes.size()) != 1) {
    throw std::runtime_error("no random bytes");
  }
  constexpr std::string_view DIGITS = "0123456789abcdef";
  std::string id = "_"; // an identifier must not begin with a digit
  for (const unsigned char byte : bytes) {
    id += DIGITS[byte >> 4u];
    id += DIGITS[byte & 15u];
  }
  return id;
}

void AddNameId(xmlNode &parent, const std::string &name) {
  SetAttribute(AddElement(parent, Ns::SAML, "NameID", name), "Format", UPN_FORMAT);
}

void AddSubject(xmlNode &assertion, const TokenFacts &facts) {
  xmlNode &subject = AddElement(assertion, Ns::SAML, "Subject");
  AddNameId(subject, facts.subject);
  xmlNode &confirmation = AddElement(subject, Ns::SAML, "SubjectConfirmation");
  const bool isBearer = facts.certificate.empty();
  SetAttribute(confirmation, "Method", isBearer ? BEARER_METHOD : HOLDER_OF_KEY_METHOD);
  if (!facts.delegation.empty()) {
    AddNameId(confirmation, facts.delegation.back().name);
  }
  xmlNode &data = AddElement(confirmation, Ns::SAML, "SubjectConfirmationData");
  if (isBearer) {
    SetAttribute(data, "NotOnOrAfter", TimeText(facts.notOnOrAfter));
    return;
  }
  SetAttribute(data, Ns::XSI, "type", std::string(Ns::SAML.prefix) + ":KeyInfoConfirmationDataType");
  xmlNode &x509 = AddElement(AddElement(data, Ns::DS, "KeyInfo"), Ns::DS, "X509Data");
  AddElement(x509, Ns::DS, "X509Certificate", facts.certificate);
}

void AddDelegation(xmlNode &conditions, const std::vector<DelegationStep> &delegation) {
  xmlNode &condition = AddElement(conditions, Ns::SAML, "Condition");
  DeclareNamespace(condition, Ns::DELEGATION);
  SetAttribute(condition, Ns::XSI, "type", std::string(Ns::DELEGATION.prefix) + ":DelegationRestrictionType");
  for (const DelegationStep &step : delegation) {
    xmlNode &delegate = AddElement(condition, Ns::DELEGATION, "Delegate");
    SetAttribute(delegate, "DelegationInstant", TimeText(step.instant));
    AddNameId(delegate, step.name);
  }
}

void AddRenewal(xmlNode &conditions, std::uint64_t count) {
  xmlNode &condition = AddElement(conditions, Ns::SAML, "Condition");
  DeclareNamespace(condition, Ns::EXTENSION);
  SetAttribute(condition, Ns::XSI, "type", std::string(Ns::EXTENSION.prefix) + ":RenewRestrictionType");
  SetAttribute(condition, "Count", std::to_string(count));
  SetAttribute(condition, "Postdatable", "false");
  SetAttribute(condition, "RenewExpired", "false");
}

void AddConditions(xmlNode &assertion, const TokenFacts &facts) {
  xmlNode &conditions = AddElement(assertion, Ns::SAML, "Conditions");
  SetAttribute(conditions, "NotBefore", TimeText(facts.notBefore));
  SetAttribute(conditions, "NotOnOrAfter", TimeText(facts.notOnOrAfter));
  if (!facts.audience.empty()) {
    xmlNode &restriction = AddElement(conditions, Ns::SAML, "AudienceRestriction");
    for (const std::string &audience : facts.audience) {
      AddElement(restriction, Ns::SAML, "Audience", audience);
    }
  }
  if (!facts.delegation.empty()) {
    AddDelegation(conditions, facts.delegation);
  }
  SetAttribute(AddElement(conditions, Ns::SAML, "ProxyRestriction"), "Count", std::to_string(facts.delegations));
  AddRenewal(conditions, facts.renewals);
}

void AddAttribute(xmlNode &parent, const std::string &name, const std::vector<std::string> &values,
                  const char *friendlyName) {
  xmlNode &attribute = AddElement(parent, Ns::SAML, "Attribute");
  SetAttribute(attribute, "Name", name);
  if (friendlyName) {
    SetAttribute(attribute, "NameFormat", ATTRIBUTE_NAME_FORMAT);
    SetAttribute(attribute, "FriendlyName", friendlyName);
  }
  for (const std::string &value : values) {
    AddElement(attribute, Ns::SAML, "AttributeValue", value);
  }
}

void AddAdvice(xmlNode &assertion, const std::vector<AdviceEntry> &entries) {
  xmlNode &advice = AddElement(assertion, Ns::SAML, "Advice");
  for (const AdviceEntry &entry : entries) {
    xmlNode &element = AddElement(advice, Ns::EXTENSION, "RSAAdvice");
    SetAttribute(element, "AdviceSource", entry.source);
    for (const AdviceAttribute &attribute : entry.attributes) {
      AddAttribute(element, attribute.name, attribute.values, nullptr);
    }
  }
}

void AddAuthentication(xmlNode &assertion, const TokenFacts &facts) {
  xmlNode &statement = AddElement(assertion, Ns::SAML, "AuthnStatement");
  SetAttribute(statement, "AuthnInstant", TimeText(facts.authenticated));
  xmlNode &context = AddElement(statement, Ns::SAML, "AuthnContext");
  AddElement(context, Ns::SAML, "AuthnContextClassRef", facts.context);
}

void AddAttributes(xmlNode &assertion, const TokenFacts &facts) {
  xmlNode &statement = AddElement(assertion, Ns::SAML, "AttributeStatement");
  if (!facts.groups.empty()) {
    AddAttribute(statement, GROUP_ATTRIBUTE, facts.groups, "Groups");
  }
  if (!facts.first.empty()) {
    AddAttribute(statement, FIRST_NAME_ATTRIBUTE, {facts.first}, "givenName");
  }
  if (!facts.last.empty()) {
    AddAttribute(statement, LAST_NAME_ATTRIBUTE, {facts.last}, "surname");
  }
  AddAttribute(statement, SOLUTION_ATTRIBUTE, {facts.isSolution ? "true" : "false"}, "isSolution");
}

} // namespace

Document BuildToken(const TokenFacts &facts) {
  Document document = NewDocument(Ns::SAML, "Assertion");
  xmlNode &assertion = *xmlDocGetRootElement(document.get());
  SetAttribute(assertion, "ID", NewIdentifier());
  SetAttribute(assertion, "IssueInstant", TimeText(Now()));
  SetAttribute(assertion, "Version", "2.0");
  SetAttribute(AddElement(assertion, Ns::SAML, "Issuer", ISSUER), "Format", ENTITY_FORMAT);
  AddSubject(assertion, facts);
  AddConditions(assertion, facts);
  if (!facts.advice.empty()) {
    AddAdvice(assertion, facts.advice);
  }
  AddAuthentication(assertion, facts);
  AddAttributes(assertion, facts);
  return document;
}

std::string TokenId(const xmlDoc &token) {
  return AttributeOf(*xmlDocGetRootElement(&token), "ID").value_or("");
}

void SignToken(xmlDoc &token, const SignatureKey &signer) {
  xmlNode &assertion = *xmlDocGetRootElement(&token);
  RegisterIdentifiers(token);
  SignEnveloped(assertion, TokenId(token), RequireChild(assertion, Ns::SAML, "Issuer"), signer);
}

} // namespace DevSts
