// SPDX-License-Identifier: Apache-2.0

#include "token_reader.h"

#include <charconv>

namespace DevSts {

namespace {

[[noreturn]] void RefuseToken(const std::string &reason) {
  throw Refusal(Code::INVALID_TOKEN, reason); // `ReadIssuedToken` replaces the code
}

std::string RequireAttribute(const xmlNode &element, const char *name) {
  const std::optional<std::string> value = AttributeOf(element, name);
  if (!value) {
    RefuseToken(std::string("the token lacks an attribute ") + name);
  }
  return *value;
}

Time RequireTime(const xmlNode &element, const char *name) {
  const std::optional<Time> time = ParseTime(RequireAttribute(element, name));
  if (!time) {
    RefuseToken(std::string("the token's ") + name + " is not a date");
  }
  return *time;
}

std::uint64_t CountOf(const xmlNode &restriction) {
  const std::string text = AttributeOf(restriction, "Count").value_or("");
  std::uint64_t count = 0;
  std::from_chars(text.data(), text.data() + text.size(), count);
  return count;
}

void VerifySignature(const xmlNode &assertion, const Identifiers &identifiers, const SignatureKey &signer) {
  xmlNode &signature = RequireChild(assertion, Ns::DS, "Signature");
  const std::vector<SignatureReference> references = ReadReferences(signature);
  if (references.size() != 1 || !references[0].isEnveloped || identifiers.count(references[0].id) == 0 ||
      identifiers.at(references[0].id) != &assertion) {
    RefuseToken("the token's signature does not cover the token");
  }
  if (!VerifiesWith(signature, signer)) {
    RefuseToken("the token is not signed by this service");
  }
}

void ReadSubject(const xmlNode &subject, TokenFacts &facts) {
  facts.subject = TextOf(RequireChild(subject, Ns::SAML, "NameID"));
  const xmlNode &confirmation = RequireChild(subject, Ns::SAML, "SubjectConfirmation");
  if (RequireAttribute(confirmation, "Method") == HOLDER_OF_KEY_METHOD) {
    const xmlNode &data = RequireChild(confirmation, Ns::SAML, "SubjectConfirmationData");
    const xmlNode &x509 = RequireChild(RequireChild(data, Ns::DS, "KeyInfo"), Ns::DS, "X509Data");
    facts.certificate = TextOf(RequireChild(x509, Ns::DS, "X509Certificate"));
  }
}

void ReadCondition(const xmlNode &condition, TokenFacts &facts) {
  if (IsElement(condition, Ns::SAML, "ProxyRestriction")) {
    facts.delegations = CountOf(condition);
    return;
  }
  if (IsElement(condition, Ns::SAML, "AudienceRestriction")) {
    for (const xmlNode *audience : ChildElements(condition)) {
      facts.audience.push_back(TextOf(*audience));
    }
    return;
  }
  const std::string type = AttributeOf(condition, Ns::XSI, "type").value_or("");
  if (type == std::string(Ns::EXTENSION.prefix) + ":RenewRestrictionType") {
    facts.renewals = CountOf(condition);
    return;
  }
  for (const xmlNode *delegate : ChildElements(condition)) {
    facts.delegation.push_back(
        {TextOf(RequireChild(*delegate, Ns::SAML, "NameID")), RequireTime(*delegate, "DelegationInstant")});
  }
}

std::vector<std::string> ReadValues(const xmlNode &attribute) {
  std::vector<std::string> values;
  for (const xmlNode *value : ChildElements(attribute)) {
    values.push_back(TextOf(*value));
  }
  return values;
}

void ReadAdvice(const xmlNode &advice, TokenFacts &facts) {
  for (const xmlNode *entry : ChildElements(advice)) {
    AdviceEntry &read = facts.advice.emplace_back();
    read.source = RequireAttribute(*entry, "AdviceSource");
    for (const xmlNode *attribute : ChildElements(*entry)) {
      read.attributes.push_back({RequireAttribute(*attribute, "Name"), ReadValues(*attribute)});
    }
  }
}

void ReadAttribute(const xmlNode &attribute, TokenFacts &facts) {
  const std::string name = RequireAttribute(attribute, "Name");
  const std::vector<std::string> values = ReadValues(attribute);
  const std::string first = values.empty() ? std::string() : values.front();
  if (name == GROUP_ATTRIBUTE) {
    facts.groups = values;
  } else if (name == FIRST_NAME_ATTRIBUTE) {
    facts.first = first;
  } else if (name == LAST_NAME_ATTRIBUTE) {
    facts.last = first;
  } else if (name == SOLUTION_ATTRIBUTE) {
    facts.isSolution = first == "true";
  }
}

TokenFacts ReadFacts(const xmlNode &assertion) {
  TokenFacts facts;
  ReadSubject(RequireChild(assertion, Ns::SAML, "Subject"), facts);
  const xmlNode &conditions = RequireChild(assertion, Ns::SAML, "Conditions");
  facts.notBefore = RequireTime(conditions, "NotBefore");
  facts.notOnOrAfter = RequireTime(conditions, "NotOnOrAfter");
  for (const xmlNode *condition : ChildElements(conditions)) {
    ReadCondition(*condition, facts);
  }
  if (const xmlNode *advice = FindChild(assertion, Ns::SAML, "Advice")) {
    ReadAdvice(*advice, facts);
  }
  const xmlNode &statement = RequireChild(assertion, Ns::SAML, "AuthnStatement");
  facts.authenticated = RequireTime(statement, "AuthnInstant");
  facts.context =
      TextOf(RequireChild(RequireChild(statement, Ns::SAML, "AuthnContext"), Ns::SAML, "AuthnContextClassRef"));
  if (const xmlNode *attributes = FindChild(assertion, Ns::SAML, "AttributeStatement")) {
    for (const xmlNode *attribute : ChildElements(*attributes)) {
      ReadAttribute(*attribute, facts);
    }
  }
  return facts;
}

} // namespace

TokenFacts ReadIssuedToken(const xmlNode &assertion, const Identifiers &identifiers, const SignatureKey &signer,
                           const FaultCode &code) {
  try {
    VerifySignature(assertion, identifiers, signer);
    return ReadFacts(assertion);
  } catch (const Refusal &refusal) {
    throw Refusal(code, refusal.what());
  }
}

} // namespace DevSts
