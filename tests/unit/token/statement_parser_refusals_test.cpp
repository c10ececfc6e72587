// SPDX-License-Identifier: Apache-2.0

#include "unit/token/assertion_refusals.h"
#include "unit/token/assertion_text.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace Testing;

TEST(AssertionRefusals, Advice) {
  const std::string advice = "<rsa:RSAAdvice AdviceSource=\"urn:mapper\">";
  ExpectRefusals(
      BearerAssertion(),
      {
          {"<saml:Advice>", "<saml:Advice ID=\"\">", "Unexpected attributes on element 'saml:Advice'"},
          {"<saml:Advice>", "<saml:Advice><saml:AssertionIDRef/>", NotFound("RSAAdvice")},
          {"<saml:Advice>", "<saml:Advice>text", NotFound("RSAAdvice")},
          {advice, "<rsa:RSAAdvice>", "Node 'rsa:RSAAdvice is missing required attribute 'AdviceSource'"},
          {advice, "<rsa:RSAAdvice AdviceSource=\"\" Extra=\"\">", "Unexpected attributes on element 'rsa:RSAAdvice'"},
          {advice, "<rsa:RSAAdvice xmlns:rsa=\"urn:other\" AdviceSource=\"\">",
           "Element 'rsa:RSAAdvice' has unexpected namespace"},
          {advice, advice + "<saml:Other/>", NotFound("Attribute")},
          {"<saml:Attribute Name=\"color\">", "<saml:Attribute>",
           "Node 'saml:Attribute is missing required attribute 'Name'"},
      });
}

TEST(AssertionRefusals, AuthnStatement) {
  const std::string instant = " AuthnInstant=\"2026-01-01T00:00:03Z\"";
  const std::string reference = Piece::CLASS_REF;
  const std::string end = "</saml:AuthnContext>";
  ExpectRefusals(
      BearerAssertion(),
      {
          {instant, "", "Node 'saml:AuthnStatement is missing required attribute 'AuthnInstant'"},
          {instant, instant + " SessionIndex=\"\"", "Unexpected attributes on element 'saml:AuthnStatement'"},
          {instant, " AuthnInstant=\"now\"", "saml:AuthnStatement/@AuthnInstant is not a date"},
          {"<saml:AuthnStatement ", "<saml:AuthnStatement xmlns:saml=\"urn:other\" ",
           "Element 'saml:AuthnStatement' has unexpected namespace"},
          {"<saml:AuthnContext>", "<saml:AuthnContext xmlns:saml=\"urn:other\">",
           "Element 'saml:AuthnContext' has unexpected namespace"},
          {"<saml:AuthnContextClassRef>", "<saml:AuthnContextClassRef xmlns:saml=\"urn:other\">",
           "Element 'saml:AuthnContextClassRef' has unexpected namespace"},
          {"<saml:AuthnContext>", "<saml:AuthnContext ID=\"\">",
           "Unexpected attributes on element 'saml:AuthnContext'"},
          {"<saml:AuthnContext>", "<saml:SubjectLocality/><saml:AuthnContext>", NotFound("AuthnContext")},
          {end, end + "<saml:AuthnContext/>", "Unexpected elements after AuthnContext"},
          {end, end + "text", "Unexpected elements after AuthnContext"},
          {reference, "", NotFound("AuthnContextClassRef")},
          {reference, Twice(reference), "Unexpected elements after AuthnContextClassRef"},
          {reference, "<saml:AuthnContextClassRef/>", OnlyText("saml:AuthnContextClassRef")},
          {"<saml:AuthnContextClassRef>", "<saml:AuthnContextClassRef ID=\"\">",
           "Unexpected attributes on element 'saml:AuthnContextClassRef'"},
      });
}

TEST(AssertionRefusals, AttributeStatement) {
  const std::string attribute = "<saml:Attribute Name=\"urn:two\"/>";
  const std::string first = "<saml:AttributeValue>first</saml:AttributeValue>";
  ExpectRefusals(
      BearerAssertion(),
      {
          {"<saml:AttributeStatement>", "<saml:AttributeStatement ID=\"\">",
           "Unexpected attributes on element 'saml:AttributeStatement'"},
          {attribute, "<saml:EncryptedAttribute/>", NotFound("Attribute")},
          {attribute, "text", NotFound("Attribute")},
          {attribute, "<saml:Attribute/>", "Node 'saml:Attribute is missing required attribute 'Name'"},
          {attribute, "<saml:Attribute Name=\"\" Extra=\"\"/>", "Unexpected attributes on element 'saml:Attribute'"},
          {attribute, "<rsa:Attribute Name=\"\"/>", "Element 'rsa:Attribute' has unexpected namespace"},
          {first, "<saml:AttributeValue/>", OnlyText("saml:AttributeValue")},
          {first, "<saml:AttributeValue> \n</saml:AttributeValue>", OnlyText("saml:AttributeValue")},
          {first, "<saml:AttributeValue>a<b/></saml:AttributeValue>", OnlyText("saml:AttributeValue")},
          {first, "<saml:AttributeValue xmlns:saml=\"urn:other\">first</saml:AttributeValue>",
           "Element 'saml:AttributeValue' has unexpected namespace"},
          {first, "<saml:AttributeValue xmlns:x=\"urn:x\" x:more=\"2\">first</saml:AttributeValue>",
           "Unexpected attribute '{urn:x}more' on element 'saml:AttributeValue'"},
          {first, "<saml:AttributeValue Extra=\"\">first</saml:AttributeValue>",
           "Unexpected attribute 'Extra' on element 'saml:AttributeValue'"},
          {first, "<saml:AttributeValue type=\"xs:string\">first</saml:AttributeValue>",
           "Unexpected attribute 'type' on element 'saml:AttributeValue'"},
          {first, "<saml:AttributeValue xsi:type=\"xs:string\" xsi:nil=\"false\">first</saml:AttributeValue>",
           "Unexpected attribute '{http://www.w3.org/2001/XMLSchema-instance}nil' on element 'saml:AttributeValue'"},
          {first, "<saml:Other>first</saml:Other>", NotFound("AttributeValue")},
          {first, "first", NotFound("AttributeValue")},
      });
}

} // namespace
