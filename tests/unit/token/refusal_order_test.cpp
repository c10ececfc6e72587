// SPDX-License-Identifier: Apache-2.0
// When an assertion has two faults, the first in a fixed order is reported: relying parties and support rely on that.
#include "support/parsed_document.h"
#include "support/throws_message.h"
#include "token/assertion_parser.h"
#include "token/token_facts.h"
#include "unit/token/assertion_text.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;

struct Change {
  std::string from;
  std::string to;
};

void ParseChanged(std::string text, const std::vector<Change> &changes) {
  for (const Change &change : changes) {
    text = ReplaceOnce(text, change.from, change.to);
  }
  const ParsedDocument document(text);
  NodeFilterIterator iterator = document.Cursor();
  SamlAssertionType assertion;
  ParseSamlAssertionElement(iterator, assertion);
}

/// Each change by itself must be refused with its own message, and both together with the message of the first.
void ExpectFirst(const std::string &valid, const Change &first, const std::string &message, const Change &second,
                 const std::string &secondMessage) {
  SCOPED_TRACE(message + " | " + secondMessage);
  EXPECT_THROWS_MESSAGE(ParseChanged(valid, {first}), ParseException, message);
  EXPECT_THROWS_MESSAGE(ParseChanged(valid, {second}), ParseException, secondMessage);
  EXPECT_THROWS_MESSAGE(ParseChanged(valid, {first, second}), ParseException, message);
}

std::string Missing(const std::string &element, const std::string &attribute) {
  return "Node '" + element + " is missing required attribute '" + attribute + "'";
}

std::string NotADate(const std::string &element, const std::string &attribute) {
  return element + "/@" + attribute + " is not a date";
}

std::string NotFound(const std::string &name) {
  return "Expected element '" + name + "' not found.";
}

const Change NO_VERSION{" Version=\"2.0\"", ""};
const Change NO_ID{" ID=\"_a1\"", ""};
const Change NO_ISSUE_INSTANT{" IssueInstant=\"2026-01-01T00:00:00Z\"", ""};
const Change NO_NOT_BEFORE{" NotBefore=\"2026-01-01T00:00:00Z\"", ""};
const Change NO_NOT_ON_OR_AFTER{" NotOnOrAfter=\"2026-01-01T07:00:00Z\"", ""};
const Change BAD_NOT_BEFORE{" NotBefore=\"2026-01-01T00:00:00Z\"", " NotBefore=\"\""};
const Change BAD_NOT_ON_OR_AFTER{" NotOnOrAfter=\"2026-01-01T07:00:00Z\"", " NotOnOrAfter=\"\""};

TEST(RefusalOrder, RequiredAttributesOfTheAssertionAreVersionThenIdThenIssueInstant) {
  ExpectFirst(BearerAssertion(), NO_VERSION, Missing("saml:Assertion", "Version"), NO_ID,
              Missing("saml:Assertion", "ID"));
  ExpectFirst(BearerAssertion(), NO_ID, Missing("saml:Assertion", "ID"), NO_ISSUE_INSTANT,
              Missing("saml:Assertion", "IssueInstant"));
}

TEST(RefusalOrder, AMissingAttributeIsReportedBeforeAnUnexpectedOne) {
  ExpectFirst(BearerAssertion(), NO_ISSUE_INSTANT, Missing("saml:Assertion", "IssueInstant"),
              {" ID=\"_a1\"", " Extra=\"\" ID=\"_a1\""}, "Unexpected attributes on element 'saml:Assertion'");
}

TEST(RefusalOrder, RequiredAttributesOfTheConditionsAreNotBeforeThenNotOnOrAfter) {
  ExpectFirst(BearerAssertion(), NO_NOT_BEFORE, Missing("saml:Conditions", "NotBefore"), NO_NOT_ON_OR_AFTER,
              Missing("saml:Conditions", "NotOnOrAfter"));
}

TEST(RefusalOrder, DatesOfTheConditionsAreReadInTheSameOrder) {
  ExpectFirst(BearerAssertion(), BAD_NOT_BEFORE, NotADate("saml:Conditions", "NotBefore"), BAD_NOT_ON_OR_AFTER,
              NotADate("saml:Conditions", "NotOnOrAfter"));
}

TEST(RefusalOrder, AnElementsNamespaceIsCheckedBeforeItsAttributes) {
  ExpectFirst(BearerAssertion(), {"<saml:AuthnStatement ", "<saml:AuthnStatement xmlns:saml=\"urn:other\" "},
              "Element 'saml:AuthnStatement' has unexpected namespace", {" AuthnInstant=\"2026-01-01T00:00:03Z\"", ""},
              Missing("saml:AuthnStatement", "AuthnInstant"));
}

TEST(RefusalOrder, TheSetOfAttributesIsCheckedBeforeTheirValues) {
  ExpectFirst(BearerAssertion(),
              {" NotOnOrAfter=\"2026-01-01T07:00:00Z\"", " NotOnOrAfter=\"2026-01-01T07:00:00Z\" Extra=\"\""},
              "Unexpected attributes on element 'saml:Conditions'", BAD_NOT_BEFORE,
              NotADate("saml:Conditions", "NotBefore"));
}

TEST(RefusalOrder, TheDateOfTheAssertionIsCheckedBeforeItsChildren) {
  ExpectFirst(BearerAssertion(), {" IssueInstant=\"2026-01-01T00:00:00Z\"", " IssueInstant=\"\""},
              NotADate("saml:Assertion", "IssueInstant"), {Piece::ISSUER, ""}, NotFound("Issuer"));
}

TEST(RefusalOrder, TheDatesOfTheConditionsAreCheckedBeforeTheRestrictions) {
  for (const auto &date : {std::pair(BAD_NOT_BEFORE, "NotBefore"), std::pair(BAD_NOT_ON_OR_AFTER, "NotOnOrAfter")}) {
    ExpectFirst(BearerAssertion(), date.first, NotADate("saml:Conditions", date.second),
                {Piece::PROXY_RESTRICTION, "<saml:OneTimeUse/>"},
                "Unknown or duplicate restriction node under Conditions: saml:OneTimeUse");
  }
}

TEST(RefusalOrder, TheDateOfADelegateIsCheckedBeforeItsName) {
  ExpectFirst(BearerAssertion(), {"DelegationInstant=\"2026-01-01T00:00:02Z\"", "DelegationInstant=\"\""},
              NotADate("del:Delegate", "DelegationInstant"),
              {"<saml:NameID Format=\"urn:format:last\">backup@corp</saml:NameID>", ""}, NotFound("NameID"));
}

TEST(RefusalOrder, TheDateOfTheAuthnStatementIsCheckedBeforeItsContext) {
  ExpectFirst(BearerAssertion(), {"AuthnInstant=\"2026-01-01T00:00:03Z\"", "AuthnInstant=\"\""},
              NotADate("saml:AuthnStatement", "AuthnInstant"), {Piece::CLASS_REF, ""},
              NotFound("AuthnContextClassRef"));
}

TEST(RefusalOrder, TheFormatOfANameIsCheckedBeforeItsText) {
  const std::string onlyText = " must only have textual content (but has extra children or is empty).";
  ExpectFirst(BearerAssertion(), {" Format=\"urn:format:issuer\"", ""}, Missing("saml:Issuer", "Format"),
              {"the issuer", ""}, "Element 'saml:Issuer'" + onlyText);
  ExpectFirst(BearerAssertion(), {" Format=\"urn:format:subject\"", ""}, Missing("saml:NameID", "Format"),
              {"alice@corp", ""}, "Element 'saml:NameID'" + onlyText);
}

TEST(RefusalOrder, TheConfirmationMethodIsCheckedBeforeTheConfirmationData) {
  ExpectFirst(BearerAssertion(), {"Method=\"urn:oasis:names:tc:SAML:2.0:cm:bearer\"", "Method=\"\""},
              "Unknown subject confirmation method: ''", {Piece::BEARER_DATA, ""}, NotFound("SubjectConfirmationData"));
}

TEST(RefusalOrder, BearerDataMustBeEmptyBeforeItsDateIsRead) {
  const std::string date = " NotOnOrAfter=\"2026-01-01T08:00:00Z\"";
  const auto parse = [&](const std::string &attribute, const std::string &content) {
    ParseChanged(BearerAssertion(), {{Piece::BEARER_DATA, "<saml:SubjectConfirmationData" + attribute + ">" + content +
                                                              "</saml:SubjectConfirmationData>"}});
  };
  EXPECT_NO_THROW(parse(date, ""));
  EXPECT_THROWS_MESSAGE(parse(" NotOnOrAfter=\"\"", ""), ParseException,
                        NotADate("saml:SubjectConfirmationData", "NotOnOrAfter"));
  EXPECT_THROWS_MESSAGE(parse(" NotOnOrAfter=\"\"", "text"), ParseException,
                        "Element 'saml:SubjectConfirmationData' must be empty");
}

TEST(RefusalOrder, TheCountOfARestrictionIsCheckedBeforeItsContent) {
  const std::string badCount = "/@Count is not a non-negative integer.";
  EXPECT_THROWS_MESSAGE(
      ParseChanged(BearerAssertion(),
                   {{Piece::PROXY_RESTRICTION, "<saml:ProxyRestriction Count=\"\">x</saml:ProxyRestriction>"}}),
      ParseException, "saml:ProxyRestriction" + badCount);
  EXPECT_THROWS_MESSAGE(
      ParseChanged(BearerAssertion(),
                   {{Piece::RENEW_RESTRICTION, "<saml:Condition xsi:type=\"rsa:RenewRestrictionType\" Count=\"\">x"
                                               "</saml:Condition>"}}),
      ParseException, "saml:Condition" + badCount);
}

constexpr const char *UPN = "http://schemas.xmlsoap.org/claims/UPN";

/// An assertion with a malformed group and a malformed delegate.
SamlAssertionType WithTwoBadNames() {
  SamlAssertionType assertion;
  assertion.Subject.NameID = {UPN, "alice@corp"};
  assertion.AttributeStatement.emplace();
  assertion.AttributeStatement->attributes.push_back(
      {SSOCLIENT_EXTENSION_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity", "", "", {"no backslash"}});
  assertion.Conditions.DelegationRestriction.emplace();
  assertion.Conditions.DelegationRestriction->delegates.push_back({{}, {UPN, "gateway"}});
  return assertion;
}

TEST(FactsOrder, TheSubjectIsReadBeforeTheAttributes) {
  SamlAssertionType assertion = WithTwoBadNames();
  assertion.Subject.NameID.value = "alice";
  EXPECT_THROWS_MESSAGE(TakeTokenFacts(std::move(assertion)), ParseException,
                        "Failed to parse the UPN NameID: `alice'; name or domain part is missing.");
}

TEST(FactsOrder, TheAttributesAreReadBeforeTheDelegates) {
  EXPECT_THROWS_MESSAGE(TakeTokenFacts(WithTwoBadNames()), ParseException,
                        "Failed to parse Group Identity value: `no backslash'; domain or group missing");
}

TEST(FactsOrder, TheDelegatesAreReadLast) {
  SamlAssertionType assertion = WithTwoBadNames();
  assertion.AttributeStatement->attributes.clear();
  EXPECT_THROWS_MESSAGE(TakeTokenFacts(std::move(assertion)), ParseException,
                        "Failed to parse the UPN NameID: `gateway'; name or domain part is missing.");
}

} // namespace
