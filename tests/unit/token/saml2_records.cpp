// SPDX-License-Identifier: Apache-2.0

#include "unit/token/saml2_records.h"

#include "support/parsed_document.h"
#include "unit/token/signed_assertion.h"

#include <list>
#include <utility>

namespace Testing {

using namespace SsoClient;
using Tarvel::System::DateTime;

namespace {

void AppendAttribute(std::string &text, const char *name, const boost::optional<std::string> &value) {
  if (value) {
    text += std::string(" ") + name + "=\"" + *value + "\"";
  }
}

/// A `NameID` element that exists until the program ends, because a record points to it.
const Tarvel::Xml::ElementNode &NameIdElement(const NameId &nameId) {
  static std::list<ParsedDocument> documents;
  std::string text = "<saml:NameID xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\"";
  AppendAttribute(text, "Format", nameId.format);
  AppendAttribute(text, "NameQualifier", nameId.nameQualifier);
  AppendAttribute(text, "SPNameQualifier", nameId.spNameQualifier);
  AppendAttribute(text, "SPProvidedID", nameId.spProvidedId);
  return documents.emplace_back(text + ">" + nameId.value + "</saml:NameID>").Root();
}

} // namespace

const NameId SUBJECT{"alice", std::string("urn:format"), std::string("urn:qualifier"), std::string("urn:sp"), {}};
const NameId DELEGATE{"backup", std::string("urn:format"), std::string("urn:qualifier"), std::string("urn:sp"), {}};

DateTime AtSecond(std::int64_t second) {
  return DateTime("2026-01-02T03:04:05.006Z").PlusSeconds(second);
}

Confirmation Confirmation::From(const DateTime &notBefore) const {
  Confirmation changed = *this;
  changed.details.notBefore = notBefore;
  return changed;
}

Confirmation Confirmation::Until(const DateTime &notOnOrAfter) const {
  Confirmation changed = *this;
  changed.details.notOnOrAfter = notOnOrAfter;
  return changed;
}

Confirmation Bearer() {
  Confirmation confirmation;
  confirmation.record.type = SamlToken::BEARER;
  confirmation.details.method = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
  return confirmation;
}

Confirmation HolderOfKey() {
  Confirmation confirmation;
  confirmation.record.type = SamlToken::HOLDER_OF_KEY;
  confirmation.details.method = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";
  confirmation.details.certificate = TokenCertificates({"holder"}).front();
  confirmation.details.publicKey = {1, 2, 3};
  return confirmation;
}

Confirmation SenderVouches() {
  Confirmation confirmation;
  confirmation.details.method = "urn:oasis:names:tc:SAML:2.0:cm:sender-vouches";
  return confirmation;
}

Saml2Assertion AssertionWith(const std::vector<Confirmation> &confirmations) {
  Saml2Assertion assertion = ValidBetween(AtSecond(-3600), AtSecond(3600));
  Put(assertion, confirmations);
  return assertion;
}

void Put(Saml2Assertion &assertion, const std::vector<Confirmation> &confirmations) {
  assertion.common.Subject.SubjectConfirmation = SubjectConfirmationType();
  assertion.details.usedConfirmation = 0;
  assertion.confirmations.clear();
  assertion.details.confirmations.clear();
  for (const Confirmation &one : confirmations) {
    assertion.confirmations.push_back(one.record);
    assertion.details.confirmations.push_back(one.details);
  }
}

Saml2Assertion ValidBetween(const DateTime &notBefore, const DateTime &notOnOrAfter) {
  Saml2Assertion assertion;
  assertion.common.Version = "2.0";
  assertion.common.ID = "_1";
  assertion.common.Conditions.NotBefore = notBefore;
  assertion.common.Conditions.NotOnOrAfter = notOnOrAfter;
  assertion.details.subject = SUBJECT;
  Put(assertion, {Bearer()});
  return assertion;
}

Saml2Assertion WithSessions(const std::vector<boost::optional<DateTime>> &ends) {
  Saml2Assertion assertion = AssertionWith({Bearer()});
  for (const boost::optional<DateTime> &end : ends) {
    assertion.details.authnStatements.emplace_back().sessionNotOnOrAfter = end;
  }
  return assertion;
}

std::vector<NameId> IdentifiersThatDifferFrom(const NameId &nameId) {
  std::vector<NameId> different(8, nameId);
  different[0].value[0] = static_cast<char>(different[0].value[0] ^ 0x20); // the other letter case
  different[1].format = boost::none;
  different[2].format = "urn:Format";
  different[3].nameQualifier = boost::none;
  different[4].nameQualifier = "urn:Qualifier";
  different[5].spNameQualifier = boost::none;
  different[6].spNameQualifier = "urn:SP";
  std::swap(different[7].nameQualifier, different[7].spNameQualifier);
  return different;
}

Saml2Assertion Delegated(const boost::optional<NameId> &confirming, const std::vector<NameId> &delegates) {
  Confirmation confirmation = Bearer();
  confirmation.details.nameId = confirming;
  Saml2Assertion assertion = AssertionWith({confirmation});
  SubjectConfirmationType &used = assertion.common.Subject.SubjectConfirmation;
  used.isMethodKnown = true;
  if (confirming) {
    used.NameID = NameIDType{confirming->format.value_or(std::string()), confirming->value};
  }
  if (!delegates.empty()) {
    assertion.common.Conditions.DelegationRestriction.emplace();
  }
  for (const NameId &delegate : delegates) {
    DelegateType &record = assertion.common.Conditions.DelegationRestriction->delegates.emplace_back();
    record.NameID = {delegate.format.value_or(std::string()), delegate.value, &NameIdElement(delegate)};
  }
  return assertion;
}

} // namespace Testing
