// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_parser.h"
#include "unit/token/saml2_refusals.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;

std::string Repeated(std::size_t count, const std::string &element) {
  std::string text;
  while (count-- != 0) {
    text += element;
  }
  return text;
}

const std::string CONDITIONS =
    "saml:AudienceRestriction, saml:OneTimeUse, saml:ProxyRestriction, and saml:Condition of the types "
    "del:DelegationRestrictionType and rsa:RenewRestrictionType";
const std::string BEARER = Piece::Confirmation("bearer", "");

TEST(Saml2Refusals, RootsThatAreNotAssertions) {
  EXPECT_EQ((Deviations{{NotFound("Assertion"), "r", "", "element saml:Assertion", "element r"}}), In("<r/>"));
  EXPECT_EQ((Deviations{{"Encrypted content is not supported: 'e:EncryptedAssertion'", "e:EncryptedAssertion", "",
                         "content that is not encrypted", "element e:EncryptedAssertion"}}),
            In("<e:EncryptedAssertion xmlns:e='urn:oasis:names:tc:SAML:2.0:assertion'><x/></e:EncryptedAssertion>"));
}

TEST(Saml2Refusals, AnAssertionInsideAnotherElementIsRead) {
  const ParsedSaml2 parsed("<r>" + BearerAssertion() + "</r>");
  EXPECT_EQ((std::vector<std::string>{NotFound("Assertion") + " | r"}), parsed.Messages());
  EXPECT_EQ("alice@corp", parsed.record.details.subject.value);
  const ParsedSaml2 none("<r>text</r>");
  EXPECT_FALSE(none.record.common.element);
}

TEST(Saml2Refusals, AttributesOfTheAssertion) {
  EXPECT_EQ((Deviations{{Missing("IssueInstant", "saml:Assertion"), "saml:Assertion", "IssueInstant",
                         "Version, ID, IssueInstant", ""}}),
            In(ChangedBearer(" IssueInstant=\"2026-01-01T00:00:00Z\"", "")));
  EXPECT_EQ((Deviations{
                {Unexpected("Extra", "saml:Assertion"), "saml:Assertion", "Extra", "Version, ID, IssueInstant", "1"}}),
            In(ChangedBearer(" Version=\"2.0\"", " Version=\"2.0\" Extra=\"1\"")));
  EXPECT_EQ((Deviations{{Unexpected("{http://www.w3.org/2001/XMLSchema-instance}nil", "saml:Assertion"),
                         "saml:Assertion", "xsi:nil", "Version, ID, IssueInstant", "true"}}),
            In(ChangedBearer(" Version=\"2.0\"", " Version=\"2.0\" xsi:nil=\"true\"")));
  EXPECT_EQ((Deviations{{Unexpected("{urn:oasis:names:tc:SAML:2.0:conditions:delegation}a", "saml:Assertion"),
                         "saml:Assertion", "del:a", "Version, ID, IssueInstant", ""}}),
            In(ChangedBearer(" Version=\"2.0\"", " Version=\"2.0\" del:a=\"\"")));
  EXPECT_EQ((Deviations{{"saml:Assertion/@IssueInstant is not a date", "saml:Assertion", "IssueInstant",
                         "a date of the form xsd:dateTime", "now"}}),
            In(ChangedBearer(" IssueInstant=\"2026-01-01T00:00:00Z\"", " IssueInstant=\"now\"")));
}

TEST(Saml2Refusals, TypesOtherThanThatOfTheSchema) {
  const std::string own = "{urn:oasis:names:tc:SAML:2.0:assertion}AssertionType";
  EXPECT_EQ((Deviations{{"Unexpected type of element 'saml:Assertion': "
                         "'{urn:oasis:names:tc:SAML:2.0:assertion}SubjectType'",
                         "saml:Assertion", "xsi:type", own, "saml:SubjectType"}}),
            In(ChangedBearer(" Version=\"2.0\"", " Version=\"2.0\" xsi:type=\"saml:SubjectType\"")));
  EXPECT_EQ((Deviations{{"Unexpected type of element 'saml:Assertion': 'AssertionType'", "saml:Assertion", "xsi:type",
                         own, "AssertionType"}}),
            In(ChangedBearer(" Version=\"2.0\"", " Version=\"2.0\" xsi:type=\"AssertionType\"")));
  EXPECT_EQ((Deviations{{"Element saml:Assertionat 1,1 uses undefined prefix: `x'", "saml:Assertion", "xsi:type",
                         "a declared prefix", "x:AssertionType"}}),
            In(ChangedBearer(" Version=\"2.0\"", " Version=\"2.0\" xsi:type=\"x:AssertionType\"")));
  EXPECT_EQ((Deviations{{"Unexpected type of element 'saml:SubjectConfirmationData': "
                         "'{urn:oasis:names:tc:SAML:2.0:assertion}AssertionType'",
                         "saml:SubjectConfirmationData", "xsi:type",
                         "{urn:oasis:names:tc:SAML:2.0:assertion}SubjectConfirmationDataType", "saml:AssertionType"}}),
            In(ChangedBearer("<saml:SubjectConfirmationData ",
                             "<saml:SubjectConfirmationData xsi:type='saml:AssertionType' ")));
}

TEST(Saml2Refusals, AbsentElements) {
  const std::string wanted = "element saml:";
  const auto without = [&](const std::string &piece) { return In(ChangedBearer(piece, "")); };
  EXPECT_EQ((Deviations{{NotFound("Issuer"), "ds:Signature", "", wanted + "Issuer", "element ds:Signature"}}),
            without(Piece::ISSUER));
  EXPECT_EQ((Deviations{{NotFound("Subject"), "saml:Conditions", "", wanted + "Subject", "element saml:Conditions"}}),
            without(Piece::BearerSubject()));
  EXPECT_EQ((Deviations{{NotFound("Conditions"), "saml:Advice", "", wanted + "Conditions", "element saml:Advice"}}),
            without(Piece::AllConditions()));
  EXPECT_EQ((Deviations{{NotFound("NameID"), "saml:SubjectConfirmation", "", wanted + "NameID",
                         "element saml:SubjectConfirmation"}}),
            without(Piece::SUBJECT_NAME));
  EXPECT_EQ((Deviations{{NotFound("SubjectConfirmation"), "saml:Subject", "", wanted + "SubjectConfirmation", ""}}),
            In(AssertionConfirmedBy("")));
  EXPECT_EQ(
      (Deviations{{Missing("Method", "saml:SubjectConfirmation"), "saml:SubjectConfirmation", "Method", "Method", ""}}),
      In(AssertionConfirmedBy("<saml:SubjectConfirmation/>")));
}

TEST(Saml2Refusals, AMissingSignature) {
  EXPECT_EQ("Expected element ds:Signature not found | saml:Assertion",
            ParsedSaml2("<saml:Assertion xmlns:saml='urn:oasis:names:tc:SAML:2.0:assertion' Version='2.0' ID='_a1' "
                        "IssueInstant='2026-01-01T00:00:00Z'><saml:Issuer>i</saml:Issuer></saml:Assertion>")
                .Messages()
                .at(0));
  EXPECT_EQ("Token's signature must cover the entire token | ds:Signature",
            ParsedSaml2(ChangedBearer("URI=\"#_a1\"", "URI=\"#_a2\"")).Messages().at(0));
}

TEST(Saml2Refusals, NamesThatAreEmptyOrHaveEmptyQualifiers) {
  for (const char *const attribute : {"Format", "NameQualifier", "SPNameQualifier", "SPProvidedID"}) {
    const std::string message = "Attribute '" + std::string(attribute) + "' of element 'saml:NameID' must not be empty";
    for (const char *const value : {"", " "}) {
      const std::string name = std::string("<saml:NameID ") + attribute + "='" + value + "'>alice</saml:NameID>";
      EXPECT_EQ((Deviations{{message, "saml:NameID", attribute, "a text that is not white space", value}}),
                In(AssertionAbout(Piece::Subject(name, BEARER))));
    }
  }
  EXPECT_EQ((Deviations{{"Attribute 'NameQualifier' of element 'saml:Issuer' must not be empty", "saml:Issuer",
                         "NameQualifier", "a text that is not white space", ""}}),
            In(ChangedBearer("<saml:Issuer ", "<saml:Issuer NameQualifier='' ")));
  EXPECT_EQ((Deviations{{OnlyText("saml:NameID"), "saml:NameID", "", "one text", ""}}),
            In(AssertionAbout(Piece::Subject("<saml:NameID/>", BEARER))));
  EXPECT_EQ((Deviations{{OnlyText("saml:NameID"), "saml:NameID", "", "one text", "text"}}),
            In(ChangedBearer("alice@corp", "alice@corp<!-- -->.evil")));
  EXPECT_EQ((Deviations{{Unexpected("Extra", "saml:NameID"), "saml:NameID", "Extra",
                         "Format (optional), NameQualifier (optional), SPNameQualifier (optional), SPProvidedID "
                         "(optional)",
                         ""}}),
            In(AssertionAbout(Piece::Subject("<saml:NameID Extra=''>alice</saml:NameID>", BEARER))));
}

TEST(Saml2Refusals, IdentifiersThatAreEncryptedOrNotNames) {
  const ExpectedDeviation encrypted{"Encrypted content is not supported: 'saml:EncryptedID'", "saml:EncryptedID", "",
                                    "content that is not encrypted", "element saml:EncryptedID"};
  const ExpectedDeviation base{"An identifier of this kind is not supported: 'saml:BaseID'", "saml:BaseID", "",
                               "element saml:NameID", "element saml:BaseID"};
  EXPECT_EQ((Deviations{encrypted}), In(AssertionAbout(Piece::Subject("<saml:EncryptedID/>", BEARER))));
  EXPECT_EQ((Deviations{base}), In(AssertionAbout(Piece::Subject("<saml:BaseID/>", BEARER))));
  EXPECT_EQ((Deviations{encrypted}), In(AssertionConfirmedBy(Piece::Confirmation("bearer", "<saml:EncryptedID/>"))));
  EXPECT_EQ((Deviations{base}), In(AssertionConfirmedBy(Piece::Confirmation("bearer", "<saml:BaseID/>"))));
  const std::string delegate = "<saml:Condition xsi:type='del:DelegationRestrictionType'>"
                               "<del:Delegate DelegationInstant='2026-01-01T00:00:01Z'><saml:EncryptedID/>"
                               "</del:Delegate></saml:Condition>";
  EXPECT_EQ((Deviations{encrypted}), In(AssertionUnder(delegate)));
}

TEST(Saml2Refusals, ContentOfTheSubject) {
  const ParsedSaml2 parsed(AssertionAbout(Piece::Subject(Piece::SUBJECT_NAME, "<saml:Extra/>text" + BEARER)));
  EXPECT_EQ((std::vector<std::string>{NotFound("SubjectConfirmation") + " | saml:Extra",
                                      NotFound("SubjectConfirmation") + " | saml:Subject"}),
            parsed.Messages());
  EXPECT_EQ(1u, parsed.record.confirmations.size());
  EXPECT_EQ((Deviations{{Unexpected("a", "saml:Subject"), "saml:Subject", "a", "no attributes", ""}}),
            In(ChangedBearer("<saml:Subject>", "<saml:Subject a=''>")));
}

TEST(Saml2Refusals, ContentOfAConfirmation) {
  const auto bearerWith = [](const std::string &content) {
    return In(AssertionConfirmedBy(Piece::Confirmation("bearer", content)));
  };
  const std::string data = "<saml:SubjectConfirmationData/>";
  EXPECT_EQ((Deviations{{Content("saml:SubjectConfirmation", "element x"), "x", "", "no further element", "element x"},
                        {Content("saml:SubjectConfirmation", "text"), "saml:SubjectConfirmation", "",
                         "no further element", "text"}}),
            bearerWith(data + "<x/>text"));
  EXPECT_EQ((Deviations{{Content("saml:SubjectConfirmation", "element saml:NameID"), "saml:NameID", "",
                         "no further element", "element saml:NameID"}}),
            bearerWith(data + Piece::SUBJECT_NAME));
  EXPECT_EQ(
      (Deviations{{Content("saml:SubjectConfirmation", "element saml:SubjectConfirmationData"),
                   "saml:SubjectConfirmationData", "", "no further element", "element saml:SubjectConfirmationData"}}),
      bearerWith(Twice(data)));
}

TEST(Saml2Refusals, ElementsOfAnotherNamespaceWithKnownNames) {
  const auto other = [](const std::string &name) { return "<x:" + name + " xmlns:x='urn:x'/>"; };
  for (const char *const name : {"OneTimeUse", "ProxyRestriction", "AudienceRestriction", "Condition"}) {
    EXPECT_EQ((Deviations{{Content("saml:Conditions", "element x:" + std::string(name)), "x:" + std::string(name), "",
                           CONDITIONS, "element x:" + std::string(name)}}),
              In(AssertionUnder(other(name))));
  }
  for (const char *const name : {"Advice", "AuthnStatement", "AttributeStatement"}) {
    const Deviations found = In(AssertionStating(other(name)));
    ASSERT_EQ(1u, found.size());
    EXPECT_EQ(Content("saml:Assertion", "element x:" + std::string(name)), found[0].message);
  }
  for (const char *const name : {"NameID", "SubjectConfirmationData"}) {
    const Deviations found = In(AssertionConfirmedBy(Piece::Confirmation("bearer", other(name))));
    ASSERT_EQ(1u, found.size());
    EXPECT_EQ(Content("saml:SubjectConfirmation", "element x:" + std::string(name)), found[0].message);
  }
}

TEST(Saml2Refusals, AttributesOfConfirmationData) {
  const std::string allowed = "NotBefore (optional), NotOnOrAfter (optional), Recipient (optional), InResponseTo "
                              "(optional), Address (optional)";
  const auto dataWith = [](const std::string &attribute) {
    return In(
        AssertionConfirmedBy(Piece::Confirmation("bearer", "<saml:SubjectConfirmationData " + attribute + "='x'/>")));
  };
  EXPECT_EQ((Deviations{{Unexpected("Extra", "saml:SubjectConfirmationData"), "saml:SubjectConfirmationData", "Extra",
                         allowed, "x"}}),
            dataWith("Extra"));
  const std::string own = "{urn:oasis:names:tc:SAML:2.0:assertion}Address";
  EXPECT_EQ((Deviations{{Unexpected(own, "saml:SubjectConfirmationData"), "saml:SubjectConfirmationData",
                         "saml:Address", allowed, "x"}}),
            dataWith("saml:Address"));
  for (const char *const date : {"NotBefore", "NotOnOrAfter"}) {
    EXPECT_EQ((Deviations{{std::string("saml:SubjectConfirmationData/@") + date + " is not a date",
                           "saml:SubjectConfirmationData", date, "a date of the form xsd:dateTime", "x"}}),
              dataWith(date));
  }
}

TEST(Saml2Refusals, TooManyElementsOfOneKind) {
  const std::string confirmation = "<saml:SubjectConfirmation Method='m'/>";
  const std::string audiences = "<saml:AudienceRestriction><saml:Audience>a</saml:Audience></saml:AudienceRestriction>";
  const auto tooMany = [](const std::string &name) {
    return ExpectedDeviation{"More than 1000 elements 'saml:" + name + "'", "saml:" + name, "", "1000",
                             "element saml:" + name};
  };
  EXPECT_EQ((Deviations{tooMany("SubjectConfirmation"), tooMany("SubjectConfirmation")}),
            In(AssertionConfirmedBy(Repeated(MAX_REPEATED_ELEMENTS + 2, confirmation))));
  EXPECT_EQ((Deviations{tooMany("AudienceRestriction")}),
            In(AssertionUnder(Repeated(MAX_REPEATED_ELEMENTS + 1, audiences))));
  EXPECT_EQ((Deviations{tooMany("AuthnStatement")}),
            In(AssertionStating(Repeated(MAX_REPEATED_ELEMENTS + 1, Piece::AuthnStatement()))));
}

TEST(Saml2Refusals, AttributesOfTheConditions) {
  EXPECT_EQ((Deviations{{Missing("NotOnOrAfter", "saml:Conditions"), "saml:Conditions", "NotOnOrAfter",
                         "NotOnOrAfter, NotBefore (optional)", ""}}),
            In(ReplaceOnce(AssertionUnder(""), " NotOnOrAfter=\"2026-01-01T07:00:00Z\"", "")));
  EXPECT_EQ((Deviations{{"saml:Conditions/@NotBefore is not a date", "saml:Conditions", "NotBefore",
                         "a date of the form xsd:dateTime", "x"}}),
            In(ReplaceOnce(AssertionUnder(""), "NotBefore=\"2026-01-01T00:00:00Z\"", "NotBefore=\"x\"")));
}

TEST(Saml2Refusals, ConditionsThatAreUnknown) {
  const std::string unknown = "Unknown condition, so the token is indeterminate: '{urn:x}Other'";
  EXPECT_EQ((Deviations{{unknown, "saml:Condition", "", CONDITIONS, "{urn:x}Other"}}),
            In(AssertionUnder("<saml:Condition xmlns:x='urn:x' xsi:type='x:Other'/>")));
  EXPECT_EQ((Deviations{{"Condition without a type, so the token is indeterminate: 'saml:Condition'", "saml:Condition",
                         "", CONDITIONS, "no xsi:type"}}),
            In(AssertionUnder("<saml:Condition/>")));
  const std::string unbound = AssertionUnder("<saml:Condition xsi:type='x:Other'/>");
  const std::string column = std::to_string(unbound.find("<saml:Condition xsi") + 1);
  EXPECT_EQ((Deviations{{"Element saml:Conditionat 1," + column + " uses undefined prefix: `x'", "saml:Condition",
                         "xsi:type", "a declared prefix", "x:Other"}}),
            In(unbound));
  EXPECT_EQ((Deviations{{Content("saml:Conditions", "element x"), "x", "", CONDITIONS, "element x"},
                        {Content("saml:Conditions", "text"), "saml:Conditions", "", CONDITIONS, "text"}}),
            In(AssertionUnder("<x/>text")));
}

TEST(Saml2Refusals, ConditionsThatMayOccurOnceOnly) {
  EXPECT_EQ((Deviations{{"Repeated element: 'saml:OneTimeUse'", "saml:OneTimeUse", "", "at most one",
                         "element saml:OneTimeUse"}}),
            In(AssertionUnder("<saml:OneTimeUse/><saml:OneTimeUse/>")));
  EXPECT_EQ((Deviations{{"Repeated element: 'saml:ProxyRestriction'", "saml:ProxyRestriction", "", "at most one",
                         "element saml:ProxyRestriction"}}),
            In(AssertionUnder(Twice(Piece::PROXY_RESTRICTION))));
  const std::string delegation = "{urn:oasis:names:tc:SAML:2.0:conditions:delegation}DelegationRestrictionType";
  EXPECT_EQ((Deviations{{"Repeated condition: '" + delegation + "'", "saml:Condition", "", "at most one", delegation}}),
            In(AssertionUnder(Twice(Piece::DelegationRestriction()))));
  const std::string renew = "{http://www.rsa.com/names/2009/12/std-ext/SAML2.0}RenewRestrictionType";
  EXPECT_EQ((Deviations{{"Repeated condition: '" + renew + "'", "saml:Condition", "", "at most one", renew}}),
            In(AssertionUnder(Twice(Piece::RENEW_RESTRICTION))));
}

TEST(Saml2Refusals, ContentOfConditions) {
  const std::string audience = "element saml:Audience";
  EXPECT_EQ((Deviations{{NotFound("Audience"), "saml:AudienceRestriction", "", audience, ""}}),
            In(AssertionUnder("<saml:AudienceRestriction/>")));
  EXPECT_EQ((Deviations{{NotFound("Audience"), "x", "", audience, "element x"}}),
            In(AssertionUnder("<saml:ProxyRestriction><x/></saml:ProxyRestriction>")));
  EXPECT_EQ((Deviations{{OnlyText("saml:Audience"), "saml:Audience", "", "one text", ""}}),
            In(AssertionUnder("<saml:AudienceRestriction><saml:Audience/></saml:AudienceRestriction>")));
  EXPECT_EQ((Deviations{{"saml:ProxyRestriction/@Count is not a non-negative integer.", "saml:ProxyRestriction",
                         "Count", "a non-negative integer", "-1"}}),
            In(AssertionUnder("<saml:ProxyRestriction Count='-1'/>")));
  EXPECT_EQ((Deviations{{"Element 'saml:OneTimeUse' must be empty", "saml:OneTimeUse", "", "no content", "text"}}),
            In(AssertionUnder("<saml:OneTimeUse>text</saml:OneTimeUse>")));
  EXPECT_EQ((Deviations{{Unexpected("a", "saml:OneTimeUse"), "saml:OneTimeUse", "a", "no attributes", ""}}),
            In(AssertionUnder("<saml:OneTimeUse a=''/>")));
  EXPECT_EQ((Deviations{{NotFound("Delegate"), "saml:Condition", "", "element del:Delegate", ""}}),
            In(AssertionUnder("<saml:Condition xsi:type='del:DelegationRestrictionType'/>")));
}

TEST(Saml2Refusals, Delegates) {
  const auto delegate = [](const std::string &attributes, const std::string &content) {
    return In(AssertionUnder("<saml:Condition xsi:type='del:DelegationRestrictionType'><del:Delegate" + attributes +
                             ">" + content + "</del:Delegate></saml:Condition>"));
  };
  const std::string instant = " DelegationInstant='2026-01-01T00:00:01Z'";
  EXPECT_EQ((Deviations{{Missing("DelegationInstant", "del:Delegate"), "del:Delegate", "DelegationInstant",
                         "DelegationInstant, ConfirmationMethod (optional)", ""}}),
            delegate("", Piece::DELEGATE_NAME));
  EXPECT_EQ((Deviations{{NotFound("NameID"), "del:Delegate", "", "element saml:NameID", ""}}), delegate(instant, ""));
  EXPECT_EQ((Deviations{{Content("del:Delegate", "element x"), "x", "", "no further element", "element x"}}),
            delegate(instant, std::string(Piece::DELEGATE_NAME) + "<x/>"));
}

TEST(Saml2Refusals, SeveralInTheOrderOfTheDocument) {
  const ParsedSaml2 parsed("<saml:Assertion xmlns:saml='urn:oasis:names:tc:SAML:2.0:assertion'/>");
  const std::string place = " | saml:Assertion";
  EXPECT_EQ(
      (std::vector<std::string>{Missing("Version", "saml:Assertion") + place, Missing("ID", "saml:Assertion") + place,
                                Missing("IssueInstant", "saml:Assertion") + place, NotFound("Issuer") + place,
                                "Expected element ds:Signature not found" + place, NotFound("Subject") + place,
                                NotFound("Conditions") + place}),
      parsed.Messages());
  EXPECT_TRUE(parsed.record.common.element);
  EXPECT_TRUE(parsed.record.confirmations.empty());
}

TEST(Saml2Refusals, KeepWhatWasReadBefore) {
  const ParsedDocument document(
      ReplaceOnce(AssertionUnder(""), "NotBefore=\"2026-01-01T00:00:00Z\"", "NotBefore=\"x\""));
  NodeFilterIterator iterator = document.Cursor();
  Saml2Assertion read;
  const Tarvel::System::DateTime initial("2001-01-01T00:00:00Z");
  read.common.Conditions.NotBefore = initial;
  RecordedDeviations sink;
  ParseSaml2AssertionElement(iterator, read, sink);
  EXPECT_EQ(1u, sink.all.size());
  EXPECT_EQ(initial, read.common.Conditions.NotBefore);
}

} // namespace
