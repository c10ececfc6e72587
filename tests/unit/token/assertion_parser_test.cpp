// SPDX-License-Identifier: Apache-2.0

#include "token/assertion_parser.h"

#include "support/parsed_document.h"
#include "support/throws_message.h"
#include "token/statement_parser.h"
#include "unit/token/assertion_text.h"

#include <ssoclient/exceptions.h>
#include <tarvel/crypto/certificate.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;

SamlAssertionType Parse(const std::string &text) {
  const ParsedDocument document(text);
  NodeFilterIterator iterator = document.Cursor();
  SamlAssertionType assertion;
  ParseSamlAssertionElement(iterator, assertion);
  EXPECT_EQ(nullptr, iterator.node);
  return assertion;
}

TEST(ParseSamlAssertionElement, ReadsAssertionIssuerAndSubject) {
  const SamlAssertionType assertion = Parse(BearerAssertion());
  EXPECT_EQ("2.0", assertion.Version);
  EXPECT_EQ("_a1", assertion.ID);
  EXPECT_EQ(DateTime("2026-01-01T00:00:00Z"), assertion.IssueInstant);
  EXPECT_EQ((NameIDType{"urn:format:issuer", "the issuer"}), assertion.Issuer);
  EXPECT_TRUE(assertion.Signature);
  EXPECT_EQ((NameIDType{"urn:format:subject", "alice@corp"}), assertion.Subject.NameID);
}

TEST(ParseSamlAssertionElement, ReadsBearerConfirmation) {
  const SubjectConfirmationType confirmation = Parse(BearerAssertion()).Subject.SubjectConfirmation;
  EXPECT_EQ(SamlToken::BEARER, confirmation.Method);
  ASSERT_TRUE(confirmation.NameID);
  EXPECT_EQ((NameIDType{"urn:format:delegate", "backup@corp"}), *confirmation.NameID);
  EXPECT_EQ(DateTime("2026-01-01T08:00:00Z"), confirmation.SubjectConfirmationData.NotOnOrAfter);
  EXPECT_FALSE(confirmation.SubjectConfirmationData.certificate);
}

TEST(ParseSamlAssertionElement, ReadsHolderOfKeyConfirmation) {
  const SubjectConfirmationType confirmation = Parse(HolderOfKeyAssertion()).Subject.SubjectConfirmation;
  EXPECT_EQ(SamlToken::HOLDER_OF_KEY, confirmation.Method);
  EXPECT_FALSE(confirmation.NameID);
  ASSERT_TRUE(confirmation.SubjectConfirmationData.certificate);
  EXPECT_EQ("CN=holder,O=Example", confirmation.SubjectConfirmationData.certificate->GetSubject());
}

TEST(ParseSamlAssertionElement, ReadsConditions) {
  const ConditionsType conditions = Parse(BearerAssertion()).Conditions;
  EXPECT_EQ(DateTime("2026-01-01T00:00:00Z"), conditions.NotBefore);
  EXPECT_EQ(DateTime("2026-01-01T07:00:00Z"), conditions.NotOnOrAfter);
  ASSERT_TRUE(conditions.DelegationRestriction && conditions.ProxyRestriction && conditions.RenewRestriction);
  const std::vector<DelegateType> &delegates = conditions.DelegationRestriction->delegates;
  ASSERT_EQ(2u, delegates.size());
  EXPECT_EQ(DateTime("2026-01-01T00:00:01Z"), delegates[0].DelegationInstant);
  EXPECT_EQ((NameIDType{"urn:format:first", "gateway@corp"}), delegates[0].NameID);
  EXPECT_EQ(DateTime("2026-01-01T00:00:02Z"), delegates[1].DelegationInstant);
  EXPECT_EQ((NameIDType{"urn:format:last", "backup@corp"}), delegates[1].NameID);
  EXPECT_EQ(3u, conditions.ProxyRestriction->Count.value());
  EXPECT_EQ(5u, conditions.RenewRestriction->Count.value());
}

TEST(ParseSamlAssertionElement, CountsEqualAudiencesOnce) {
  const ConditionsType conditions = Parse(BearerAssertion()).Conditions;
  ASSERT_TRUE(conditions.AudienceRestriction);
  EXPECT_EQ((std::set<std::string>{"https://a/", "https://b/"}), conditions.AudienceRestriction->audiences);
}

TEST(ParseSamlAssertionElement, ReadsAdviceOfEachSourceInOrder) {
  const SamlAssertionType assertion = Parse(BearerAssertion());
  ASSERT_TRUE(assertion.Advice);
  const std::vector<Advice> &advice = assertion.Advice->advice;
  ASSERT_EQ(2u, advice.size());
  EXPECT_EQ("urn:mapper", advice[0].source);
  ASSERT_EQ(2u, advice[0].attributes.size());
  EXPECT_EQ("color", advice[0].attributes[0].name);
  EXPECT_EQ((std::vector<std::string>{"green", "blue"}), advice[0].attributes[0].values);
  EXPECT_EQ("size", advice[0].attributes[1].name);
  EXPECT_TRUE(advice[0].attributes[1].values.empty());
  EXPECT_EQ("urn:audit", advice[1].source);
  EXPECT_TRUE(advice[1].attributes.empty());
}

TEST(ParseSamlAssertionElement, ReadsStatements) {
  const SamlAssertionType assertion = Parse(BearerAssertion());
  EXPECT_EQ(DateTime("2026-01-01T00:00:03Z"), assertion.AuthnStatement.AuthnInstant);
  EXPECT_EQ("urn:class", assertion.AuthnStatement.AuthnContext.AuthnContextClassRef);
  ASSERT_TRUE(assertion.AttributeStatement);
  const std::vector<AttributeType> &attributes = assertion.AttributeStatement->attributes;
  ASSERT_EQ(2u, attributes.size());
  EXPECT_EQ("urn:one", attributes[0].Name);
  EXPECT_EQ("urn:name-format", attributes[0].NameFormat);
  EXPECT_EQ("One", attributes[0].FriendlyName);
  EXPECT_EQ((std::vector<std::string>{"first", "second"}), attributes[0].values);
  EXPECT_EQ("urn:two", attributes[1].Name);
  EXPECT_EQ("", attributes[1].NameFormat);
  EXPECT_EQ("", attributes[1].FriendlyName);
  EXPECT_TRUE(attributes[1].values.empty());
}

TEST(ParseSamlAssertionElement, ReservesMemoryForItsAttributesOnce) {
  std::string attributes;
  for (int i = 0; i < 5; ++i) {
    attributes += "<saml:Attribute Name=\"urn:one\"/> ";
  }
  const SamlAssertionType assertion = Parse(ReplaceOnce(BearerAssertion(), Piece::ATTRIBUTES, attributes));
  EXPECT_EQ(5u, assertion.AttributeStatement->attributes.size());
  EXPECT_EQ(5u, assertion.AttributeStatement->attributes.capacity());
}

TEST(ParseAttributeStatementElement, ReservesNoMemoryForElementsThatCannotBeAttributes) {
  std::string text = "<saml:AttributeStatement xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\">";
  for (int i = 0; i < 100; ++i) {
    text += "<saml:Attribute/>";
  }
  const ParsedDocument document(text + "</saml:AttributeStatement>");
  NodeFilterIterator iterator = document.Cursor();
  AttributeStatementType statement;
  EXPECT_THROWS_MESSAGE(ParseAttributeStatementElement(iterator, statement), ParseException,
                        "Node 'saml:Attribute is missing required attribute 'Name'");
  EXPECT_LE(statement.attributes.capacity(), 1u); // for the attribute that was being read
}

TEST(ParseSamlAssertionElement, LeavesAdviceAndAttributesEmptyWhenTheyAreAbsent) {
  const SamlAssertionType assertion = Parse(HolderOfKeyAssertion());
  EXPECT_FALSE(assertion.Advice);
  EXPECT_FALSE(assertion.AttributeStatement);
}

TEST(ParseSamlAssertionElement, LeavesRestrictionsEmptyWhenTheyAreAbsent) {
  const ConditionsType conditions = Parse(HolderOfKeyAssertion()).Conditions;
  EXPECT_FALSE(conditions.DelegationRestriction);
  EXPECT_FALSE(conditions.AudienceRestriction);
  EXPECT_FALSE(conditions.ProxyRestriction);
  EXPECT_FALSE(conditions.RenewRestriction);
}

TEST(ParseSamlAssertionElement, LeavesCountsEmptyWhenTheyAreAbsent) {
  std::string text = ReplaceOnce(BearerAssertion(), " Count=\"3\"", "");
  text = ReplaceOnce(text, " Count=\"5\"", "");
  const ConditionsType conditions = Parse(text).Conditions;
  ASSERT_TRUE(conditions.ProxyRestriction && conditions.RenewRestriction);
  EXPECT_FALSE(conditions.ProxyRestriction->Count);
  EXPECT_FALSE(conditions.RenewRestriction->Count);
}

TEST(ParseSamlAssertionElement, AcceptsEmptyAdviceAndAnEmptyAttributeStatement) {
  std::string text = ReplaceOnce(BearerAssertion(), Piece::RSA_ADVICE, "");
  text = ReplaceOnce(text, Piece::ATTRIBUTES, "");
  const SamlAssertionType assertion = Parse(text);
  ASSERT_TRUE(assertion.Advice && assertion.AttributeStatement);
  EXPECT_TRUE(assertion.Advice->advice.empty());
  EXPECT_TRUE(assertion.AttributeStatement->attributes.empty());
}

/// `text` with white space and a comment after each tag.
std::string WithGaps(const std::string &text) {
  std::string spread;
  for (const char character : text) {
    spread += character;
    if (character == '>') {
      spread += "\n <!-- note -->\t";
    }
  }
  return spread;
}

TEST(ParseSamlAssertionElement, IgnoresCommentsAndWhiteSpaceBetweenElements) {
  const SamlAssertionType assertion = Parse(Assertion(
      {WithGaps(Piece::ISSUER), Piece::SIGNATURE, WithGaps(Piece::BearerSubject()), WithGaps(Piece::AllConditions()),
       WithGaps(Piece::Advice()), WithGaps(Piece::AuthnStatement()), WithGaps(Piece::AttributeStatement())}));
  EXPECT_EQ("\tthe issuer", assertion.Issuer.value);
  EXPECT_EQ(2u, assertion.Conditions.DelegationRestriction->delegates.size());
  EXPECT_EQ(2u, assertion.Advice->advice.size());
  EXPECT_EQ(2u, assertion.AttributeStatement->attributes.size());
}

TEST(ParseSamlAssertionElement, IgnoresACommentBetweenIssuerAndSignature) {
  const std::string text = ReplaceOnce(BearerAssertion(), "</saml:Issuer>", "</saml:Issuer><!-- note -->");
  EXPECT_EQ("the issuer", Parse(text).Issuer.value);
}

TEST(ParseSamlAssertionElement, AcceptsRestrictionsInAnyOrder) {
  const std::vector<std::string> restrictions{Piece::DelegationRestriction(), Piece::AudienceRestriction(),
                                              Piece::PROXY_RESTRICTION, Piece::RENEW_RESTRICTION};
  std::vector<std::size_t> order{0, 1, 2, 3};
  do {
    std::string all;
    for (const std::size_t index : order) {
      all += restrictions[index];
    }
    const ConditionsType conditions =
        Parse(ReplaceOnce(BearerAssertion(), Piece::AllConditions(), Piece::Conditions(all))).Conditions;
    ASSERT_TRUE(conditions.DelegationRestriction && conditions.AudienceRestriction && conditions.ProxyRestriction &&
                conditions.RenewRestriction);
    EXPECT_EQ(2u, conditions.DelegationRestriction->delegates.size());
    EXPECT_EQ(2u, conditions.AudienceRestriction->audiences.size());
    EXPECT_EQ(3u, conditions.ProxyRestriction->Count.value());
    EXPECT_EQ(5u, conditions.RenewRestriction->Count.value());
  } while (std::next_permutation(order.begin(), order.end()));
}

TEST(ParseSamlAssertionElement, AcceptsAnyPrefixes) {
  std::string text = HolderOfKeyAssertion();
  for (std::size_t position; (position = text.find("saml:")) != std::string::npos;) {
    text.erase(position, 5);
  }
  text = ReplaceOnce(text, "xmlns:saml=", "xmlns=");
  EXPECT_EQ("alice@corp", Parse(text).Subject.NameID.value);
}

TEST(ParseSamlAssertionElement, KeepsTextsUnchanged) {
  const std::string text = ReplaceOnce(BearerAssertion(), ">alice@corp<", "> al&lt;ce@<![CDATA[corp&]]>\n<");
  EXPECT_EQ(" al<ce@corp&\n", Parse(text).Subject.NameID.value);
}

TEST(ParseSamlAssertionElement, AcceptsAnAttributeValueWithAType) {
  for (const char *const type :
       {"xsi:type=\"xs:string\"", "xmlns:i=\"http://www.w3.org/2001/XMLSchema-instance\" i:type=\"\"",
        "xmlns:xs=\"http://www.w3.org/2001/XMLSchema\" xsi:type=\"xs:string\"", "xmlns:x=\"urn:x\""}) {
    const std::string text = ReplaceOnce(BearerAssertion(), "<saml:AttributeValue>first<",
                                         "<saml:AttributeValue " + std::string(type) + ">first<");
    EXPECT_EQ("first", Parse(text).AttributeStatement->attributes[0].values[0]) << type;
  }
}

TEST(ParseSamlAssertionElement, MovesTheCursorToTheNextNode) {
  const ParsedDocument document("<r>" + HolderOfKeyAssertion() + " <!-- note --><next/></r>");
  NodeFilterIterator iterator = document.Cursor().GetChild();
  SamlAssertionType assertion;
  ParseSamlAssertionElement(iterator, assertion);
  ASSERT_NE(nullptr, IteratorToElement(iterator));
  EXPECT_EQ("next", IteratorToElement(iterator)->GetName());
}

} // namespace
