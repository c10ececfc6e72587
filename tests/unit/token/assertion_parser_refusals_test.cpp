// SPDX-License-Identifier: Apache-2.0

#include "support/throws_message.h"
#include "token/assertion_parser.h"
#include "unit/token/assertion_refusals.h"
#include "unit/token/assertion_text.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;

TEST(AssertionRefusals, RootThatIsNotAnAssertion) {
  EXPECT_THROWS_MESSAGE(Parse("<r/>"), ParseException, "Expected element 'Assertion' not found.");
  EXPECT_THROWS_MESSAGE(Parse("<Assertion/>"), ParseException, "Element 'Assertion' has unexpected namespace");
  EXPECT_THROWS_MESSAGE(Parse("<saml:Assertion xmlns:saml='urn:oasis:names:tc:SAML:1.0:assertion'/>"), ParseException,
                        "Element 'saml:Assertion' has unexpected namespace");
}

TEST(AssertionRefusals, NoElementAtAll) {
  NodeFilterIterator iterator(nullptr, std::make_shared<SkipWsAndCommentsFilter>());
  SamlAssertionType assertion;
  EXPECT_THROWS_MESSAGE(ParseSamlAssertionElement(iterator, assertion), ParseException,
                        "Expected element 'Assertion' not found.");
}

TEST(AssertionRefusals, AttributesOfTheAssertion) {
  const std::string missing = "Node 'saml:Assertion is missing required attribute '";
  ExpectRefusals(BearerAssertion(), {
                                        {" Version=\"2.0\"", "", missing + "Version'"},
                                        {" ID=\"_a1\"", "", missing + "ID'"},
                                        {" IssueInstant=\"2026-01-01T00:00:00Z\"", "", missing + "IssueInstant'"},
                                        {" Version=\"2.0\"", " Version=\"2.0\" Extra=\"\"",
                                         "Unexpected attributes on element 'saml:Assertion'"},
                                        {" Version=\"2.0\"", " Version=\"2.0\" xsi:type=\"saml:AssertionType\"",
                                         "Unexpected attributes on element 'saml:Assertion'"},
                                        {" IssueInstant=\"2026-01-01T00:00:00Z\"", " IssueInstant=\"\"",
                                         "saml:Assertion/@IssueInstant is not a date"},
                                    });
}

TEST(AssertionRefusals, ChildrenOfTheAssertion) {
  const std::string issuer = Piece::ISSUER;
  const std::string signature = Piece::SIGNATURE;
  const std::string subject = Piece::BearerSubject();
  const std::string conditions = Piece::AllConditions();
  const std::string advice = Piece::Advice();
  const std::string authn = Piece::AuthnStatement();
  const std::string attributes = Piece::AttributeStatement();
  const std::string column = std::to_string(BearerAssertion().find(signature) + 1);
  ExpectRefusals(
      BearerAssertion(),
      {
          {issuer, "", NotFound("Issuer")},
          {issuer, "text", NotFound("Issuer")},
          {issuer + signature, signature + issuer, NotFound("Issuer")},
          {signature + subject, subject + signature,
           "Signature syntax error: Expected ds:Signature, found \"saml:Subject\" at line 1, column " + column},
          {subject, "", NotFound("Subject")},
          {subject, Twice(subject), NotFound("Conditions")},
          {subject + conditions, conditions + subject, NotFound("Subject")},
          {conditions, "", NotFound("Conditions")},
          {conditions, Twice(conditions), NotFound("AuthnStatement")},
          {conditions + advice, advice + conditions, NotFound("Conditions")},
          {advice, Twice(advice), NotFound("AuthnStatement")},
          {advice + authn, authn + advice, NotFound("AttributeStatement")},
          {authn, "", NotFound("AuthnStatement")},
          {authn, Twice(authn), NotFound("AttributeStatement")},
          {authn + attributes, attributes + authn, NotFound("AuthnStatement")},
          {attributes, Twice(attributes), "Unexpected elements under Assertion"},
          {attributes, attributes + "text", "Unexpected elements under Assertion"},
          {attributes, attributes + "<?pi?>", "Unexpected elements under Assertion"},
          {attributes, "text" + attributes, "Unexpected elements under Assertion"},
          {attributes, "<saml:AuthzDecisionStatement/>", NotFound("AttributeStatement")},
          {"<saml:AttributeStatement>", "<saml:AttributeStatement xmlns:saml=\"urn:other\">",
           "Element 'saml:AttributeStatement' has unexpected namespace"},
          {"<saml:Advice>", "<saml:Advice xmlns:saml=\"urn:other\">", NotFound("AuthnStatement")},
      });
}

TEST(AssertionRefusals, AssertionThatEndsEarly) {
  const std::vector<std::string> children{Piece::ISSUER, Piece::SIGNATURE, Piece::BearerSubject(),
                                          Piece::AllConditions(), Piece::AuthnStatement()};
  const std::vector<std::string> messages{NotFound("Issuer"), "Expected element ds:Signature not found",
                                          NotFound("Subject"), NotFound("Conditions"), NotFound("AuthnStatement")};
  for (std::size_t count = 0; count < children.size(); ++count) {
    const std::vector<std::string> first(children.begin(), children.begin() + static_cast<std::ptrdiff_t>(count));
    EXPECT_THROWS_MESSAGE(Parse(Assertion(first)), ParseException, messages[count]);
  }
}

TEST(AssertionRefusals, Issuer) {
  ExpectRefusals(
      BearerAssertion(),
      {
          {" Format=\"urn:format:issuer\"", "", "Node 'saml:Issuer is missing required attribute 'Format'"},
          {" Format=\"urn:format:issuer\"", " Format=\"\" NameQualifier=\"\"",
           "Unexpected attributes on element 'saml:Issuer'"},
          {"the issuer", "", OnlyText("saml:Issuer")},
          {"the issuer", " \n", OnlyText("saml:Issuer")},
          {"the issuer", "the <b/>issuer", OnlyText("saml:Issuer")},
          {"the issuer", "the <!-- cut -->issuer", OnlyText("saml:Issuer")},
          {"<saml:Issuer ", "<saml:Issuer xmlns:saml=\"urn:other\" ", "Element 'saml:Issuer' has unexpected namespace"},
      });
}

} // namespace
