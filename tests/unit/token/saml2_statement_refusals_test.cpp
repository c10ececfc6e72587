// SPDX-License-Identifier: Apache-2.0

#include "unit/token/saml2_refusals.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace Testing;

TEST(Saml2Refusals, Advice) {
  EXPECT_EQ((Deviations{{Content("saml:Advice", "text"), "saml:Advice", "", "elements", "text"}}),
            In(AssertionStating("<saml:Advice>text</saml:Advice>")));
  EXPECT_EQ(
      (Deviations{{Missing("AdviceSource", "rsa:RSAAdvice"), "rsa:RSAAdvice", "AdviceSource", "AdviceSource", ""}}),
      In(AssertionStating("<saml:Advice><rsa:RSAAdvice/></saml:Advice>")));
  EXPECT_EQ((Deviations{{Content("saml:Assertion", "element saml:Advice"), "saml:Advice", "",
                         "saml:AuthnStatement, saml:AttributeStatement", "element saml:Advice"}}),
            In(AssertionStating(Piece::Advice() + "<saml:Advice/>")));
}

TEST(Saml2Refusals, StatementsThatAreNotKnown) {
  const std::string allowed = "saml:AuthnStatement, saml:AttributeStatement";
  for (const char *const name : {"saml:AuthzDecisionStatement", "saml:Statement"}) {
    EXPECT_EQ((Deviations{{std::string("A statement of this kind is not supported: '") + name + "'", name, "", allowed,
                           std::string("element ") + name}}),
              In(AssertionStating(std::string("<") + name + "/>" + Piece::AuthnStatement())));
  }
  EXPECT_EQ((Deviations{{Content("saml:Assertion", "element x"), "x", "", allowed, "element x"},
                        {Content("saml:Assertion", "text"), "saml:Assertion", "", allowed, "text"}}),
            In(AssertionStating("<x/>text" + Piece::AuthnStatement())));
}

TEST(Saml2Refusals, AuthnStatements) {
  const auto statement = [](const std::string &attributes, const std::string &content) {
    return In(AssertionStating("<saml:AuthnStatement" + attributes + ">" + content + "</saml:AuthnStatement>"));
  };
  const std::string instant = " AuthnInstant='2026-01-01T00:00:01Z'";
  const std::string context = std::string("<saml:AuthnContext>") + Piece::CLASS_REF + "</saml:AuthnContext>";
  const std::string allowed = "AuthnInstant, SessionIndex (optional), SessionNotOnOrAfter (optional)";
  EXPECT_EQ((Deviations{
                {Missing("AuthnInstant", "saml:AuthnStatement"), "saml:AuthnStatement", "AuthnInstant", allowed, ""}}),
            statement("", context));
  EXPECT_EQ((Deviations{{"saml:AuthnStatement/@SessionNotOnOrAfter is not a date", "saml:AuthnStatement",
                         "SessionNotOnOrAfter", "a date of the form xsd:dateTime", ""}}),
            statement(instant + " SessionNotOnOrAfter=''", context));
  EXPECT_EQ((Deviations{{NotFound("AuthnContext"), "saml:AuthnStatement", "", "element saml:AuthnContext", ""}}),
            statement(instant, ""));
  EXPECT_EQ((Deviations{{Content("saml:AuthnStatement", "element x"), "x", "", "no further element", "element x"}}),
            statement(instant, context + "<x/>"));
  EXPECT_EQ(
      (Deviations{{"Element 'saml:SubjectLocality' must be empty", "saml:SubjectLocality", "", "no content", "text"}}),
      statement(instant, "<saml:SubjectLocality>text</saml:SubjectLocality>" + context));
  EXPECT_EQ((Deviations{{Unexpected("a", "saml:SubjectLocality"), "saml:SubjectLocality", "a",
                         "Address (optional), DNSName (optional)", ""}}),
            statement(instant, "<saml:SubjectLocality a=''/>" + context));
}

TEST(Saml2Refusals, AuthnContexts) {
  const auto context = [](const std::string &content) {
    return In(AssertionStating("<saml:AuthnStatement AuthnInstant='2026-01-01T00:00:01Z'><saml:AuthnContext>" +
                               content + "</saml:AuthnContext></saml:AuthnStatement>"));
  };
  const std::string reference = "element saml:AuthnContextClassRef";
  const std::string authority = "<saml:AuthenticatingAuthority>a</saml:AuthenticatingAuthority>";
  EXPECT_EQ((Deviations{{NotFound("AuthnContextClassRef"), "saml:AuthnContext", "", reference, ""}}), context(""));
  EXPECT_EQ((Deviations{{NotFound("AuthnContextClassRef"), "saml:AuthenticatingAuthority", "", reference,
                         "element saml:AuthenticatingAuthority"}}),
            context(authority));
  EXPECT_EQ((Deviations{{NotFound("AuthenticatingAuthority"), "saml:AuthnContextDecl", "",
                         "element saml:AuthenticatingAuthority", "element saml:AuthnContextDecl"}}),
            context("<saml:AuthnContextDeclRef>d</saml:AuthnContextDeclRef><saml:AuthnContextDecl/>"));
  EXPECT_EQ((Deviations{{OnlyText("saml:AuthnContextClassRef"), "saml:AuthnContextClassRef", "", "one text", ""}}),
            context("<saml:AuthnContextClassRef/>"));
}

TEST(Saml2Refusals, Attributes) {
  const auto attribute = [](const std::string &attributes, const std::string &values) {
    return In(AssertionWithAttributes("<saml:Attribute" + attributes + ">" + values + "</saml:Attribute>"));
  };
  const std::string allowed = "Name, NameFormat (optional), FriendlyName (optional)";
  EXPECT_EQ((Deviations{{Missing("Name", "saml:Attribute"), "saml:Attribute", "Name", allowed, ""}}),
            attribute("", ""));
  EXPECT_EQ((Deviations{{Unexpected("a", "saml:Attribute"), "saml:Attribute", "a", allowed, ""}}),
            attribute(" Name='n' a=''", ""));
  EXPECT_EQ((Deviations{{NotFound("AttributeValue"), "x", "", "element saml:AttributeValue", "element x"}}),
            attribute(" Name='n'", "<x/>"));
  EXPECT_EQ((Deviations{{"Encrypted content is not supported: 'saml:EncryptedAttribute'", "saml:EncryptedAttribute", "",
                         "content that is not encrypted", "element saml:EncryptedAttribute"}}),
            In(AssertionWithAttributes("<saml:EncryptedAttribute/><saml:Attribute Name='n'/>")));
  EXPECT_EQ((Deviations{{NotFound("Attribute"), "x", "", "element saml:Attribute", "element x"}}),
            In(AssertionWithAttributes("<x/><saml:Attribute Name='n'/>")));
}

TEST(Saml2Refusals, ValuesInSeveralPieces) {
  EXPECT_EQ((Deviations{{OnlyText("saml:AttributeValue"), "saml:AttributeValue", "", "one text", "text"}}),
            In(AssertionWithAttributes("<saml:Attribute Name='n'><saml:AttributeValue>a<!-- -->b</saml:AttributeValue>"
                                       "</saml:Attribute>")));
}

TEST(Saml2Refusals, GroupsAndTheSolutionFlagThatAreNotTexts) {
  for (const char *const name : {SSOCLIENT_EXTENSION_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity",
                                 SSOCLIENT_SOLUTION_AUTHORITY "/schemas/attr-names/2011/07/isSolution"}) {
    for (const char *const value : {"<saml:AttributeValue><x>corp\\admins</x></saml:AttributeValue>",
                                    "<saml:AttributeValue/>", "<saml:AttributeValue xsi:nil='true'/>"}) {
      SCOPED_TRACE(value);
      const Deviations found = In(
          AssertionWithAttributes(std::string("<saml:Attribute Name='") + name + "'>" + value + "</saml:Attribute>"));
      ASSERT_EQ(1u, found.size());
      EXPECT_EQ(OnlyText("saml:AttributeValue"), found[0].message);
    }
  }
}

} // namespace
