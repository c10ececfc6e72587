// SPDX-License-Identifier: Apache-2.0

#include "support/parsed_document.h"
#include "support/throws_message.h"
#include "token/assertion_parser.h"
#include "unit/token/assertion_text.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;

/// A change of a valid assertion, and the message with which it is refused.
struct Refusal {
  std::string from;
  std::string to;
  std::string message;
};

void Parse(const std::string &text) {
  const ParsedDocument document(text);
  NodeFilterIterator iterator = document.Cursor();
  SamlAssertionType assertion;
  ParseSamlAssertionElement(iterator, assertion);
}

void ExpectRefusals(const std::string &valid, const std::vector<Refusal> &refusals) {
  ASSERT_NO_THROW(Parse(valid));
  for (const Refusal &refusal : refusals) {
    SCOPED_TRACE("replaced " + refusal.from + "\nby " + refusal.to);
    EXPECT_THROWS_MESSAGE(Parse(ReplaceOnce(valid, refusal.from, refusal.to)), ParseException, refusal.message);
  }
}

std::string Twice(const std::string &text) {
  return text + text;
}

std::string NotFound(const std::string &name) {
  return "Expected element '" + name + "' not found.";
}

std::string OnlyText(const std::string &name) {
  return "Element '" + name + "' must only have textual content (but has extra children or is empty).";
}

const std::string UNKNOWN_RESTRICTION = "Unknown or duplicate restriction node under Conditions";

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

TEST(AssertionRefusals, Subject) {
  const std::string name = Piece::SUBJECT_NAME;
  const std::string confirmation =
      Piece::Confirmation("bearer", std::string(Piece::DELEGATE_NAME) + Piece::BEARER_DATA);
  ExpectRefusals(BearerAssertion(),
                 {
                     {"<saml:Subject>", "<saml:Subject ID=\"\">", "Unexpected attributes on element 'saml:Subject'"},
                     {"<saml:Subject>", "<saml:Subject xmlns:saml=\"urn:other\">",
                      "Element 'saml:Subject' has unexpected namespace"},
                     {name, "", NotFound("NameID")},
                     {name, "<saml:BaseID/>", NotFound("NameID")},
                     {name, Twice(name), NotFound("SubjectConfirmation")},
                     {name + confirmation, confirmation + name, NotFound("NameID")},
                     {confirmation, "", NotFound("SubjectConfirmation")},
                     {confirmation, Twice(confirmation), "Unexpected elements after SubjectConfirmation"},
                     {confirmation, confirmation + "text", "Unexpected elements after SubjectConfirmation"},
                     {" Format=\"urn:format:subject\"", "", "Node 'saml:NameID is missing required attribute 'Format'"},
                     {"<saml:NameID Format=\"urn:format:subject\"", "<saml:NameID SPProvidedID=\"\" Format=\"\"",
                      "Unexpected attributes on element 'saml:NameID'"},
                     {"alice@corp", "", OnlyText("saml:NameID")},
                     {"alice@corp", "alice@corp<!-- cut -->.evil", OnlyText("saml:NameID")},
                     {"<saml:NameID Format=\"urn:format:subject\"", "<saml:NameID xmlns:saml=\"urn:other\" Format=\"\"",
                      "Element 'saml:NameID' has unexpected namespace"},
                 });
}

TEST(AssertionRefusals, SubjectConfirmation) {
  const std::string name = Piece::DELEGATE_NAME;
  const std::string data = Piece::BEARER_DATA;
  const std::string method = " Method=\"urn:oasis:names:tc:SAML:2.0:cm:bearer\"";
  ExpectRefusals(
      BearerAssertion(),
      {
          {method, "", "Node 'saml:SubjectConfirmation is missing required attribute 'Method'"},
          {method, method + " Extra=\"\"", "Unexpected attributes on element 'saml:SubjectConfirmation'"},
          {method, " Method=\"urn:oasis:names:tc:SAML:2.0:cm:sender-vouches\"",
           "Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'"},
          {method, " Method=\"\"", "Unknown subject confirmation method: ''"},
          {method, " Method=\"urn:oasis:names:tc:SAML:2.0:cm:Bearer\"",
           "Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:Bearer'"},
          {name, Twice(name), NotFound("SubjectConfirmationData")},
          {"<saml:NameID Format=\"urn:format:delegate\"",
           "<saml:NameID xmlns:saml=\"urn:other\" Format=\"urn:format:delegate\"", NotFound("SubjectConfirmationData")},
          {name + data, data + name, "Unexpected elements after SubjectConfirmationData"},
          {data, "", NotFound("SubjectConfirmationData")},
          {data, Twice(data), "Unexpected elements after SubjectConfirmationData"},
          {"<saml:SubjectConfirmation ", "<saml:SubjectConfirmation xmlns:saml=\"urn:other\" ",
           "Element 'saml:SubjectConfirmation' has unexpected namespace"},
      });
}

TEST(AssertionRefusals, BearerData) {
  const std::string data = Piece::BEARER_DATA;
  const std::string date = " NotOnOrAfter=\"2026-01-01T08:00:00Z\"";
  const auto withContent = [&](const std::string &content) {
    return "<saml:SubjectConfirmationData" + date + ">" + content + "</saml:SubjectConfirmationData>";
  };
  const std::string notEmpty = "Element 'saml:SubjectConfirmationData' must be empty";
  ExpectRefusals(
      BearerAssertion(),
      {
          {date, "", "Node 'saml:SubjectConfirmationData is missing required attribute 'NotOnOrAfter'"},
          {date, date + " Recipient=\"\"", "Unexpected attributes on element 'saml:SubjectConfirmationData'"},
          {date, date + " xsi:type=\"saml:KeyInfoConfirmationDataType\"",
           "Unexpected attributes on element 'saml:SubjectConfirmationData'"},
          {date, " NotOnOrAfter=\"soon\"", "saml:SubjectConfirmationData/@NotOnOrAfter is not a date"},
          {data, withContent("<ds:KeyInfo/>"), notEmpty},
          {data, withContent("text"), notEmpty},
          {"<saml:SubjectConfirmationData", "<saml:SubjectConfirmationData xmlns:saml=\"urn:other\"",
           "Element 'saml:SubjectConfirmationData' has unexpected namespace"},
      });
}

TEST(AssertionRefusals, HolderOfKeyData) {
  const std::string type = " xsi:type=\"saml:KeyInfoConfirmationDataType\"";
  const std::string end = "</saml:SubjectConfirmationData>";
  const std::string where = "Element saml:SubjectConfirmationDataat 1,";
  const std::string valid = HolderOfKeyAssertion();
  const std::size_t column = valid.find("<saml:SubjectConfirmationData") + 1;
  ExpectRefusals(valid, {
                            {type, "",
                             "Node 'saml:SubjectConfirmationData is missing required attribute "
                             "'{http://www.w3.org/2001/XMLSchema-instance}type'"},
                            {type, " type=\"saml:KeyInfoConfirmationDataType\"",
                             "Unexpected attribute 'type' on element 'saml:SubjectConfirmationData'"},
                            {type, type + " NotOnOrAfter=\"2026-01-01T08:00:00Z\"",
                             "Unexpected attribute 'NotOnOrAfter' on element 'saml:SubjectConfirmationData'"},
                            {type, type + " saml:NotOnOrAfter=\"\"",
                             "Unexpected attribute '{urn:oasis:names:tc:SAML:2.0:assertion}NotOnOrAfter' on element "
                             "'saml:SubjectConfirmationData'"},
                            {type, " xsi:type=\"p:KeyInfoConfirmationDataType\"",
                             where + std::to_string(column) + " uses undefined prefix: `p'"},
                            {type, " p:type=\"saml:KeyInfoConfirmationDataType\"",
                             where + std::to_string(column) + " uses undefined prefix: `p'"},
                            {type, " xsi:type=\"saml:SubjectConfirmationDataType\"",
                             "Invalid SubjectConfirmationData type: 'saml:SubjectConfirmationDataType'"},
                            {type, " xsi:type=\"KeyInfoConfirmationDataType\"",
                             "Invalid SubjectConfirmationData type: 'KeyInfoConfirmationDataType'"},
                            {type, " xsi:type=\"\"", "Invalid SubjectConfirmationData type: ''"},
                            {end, "<ds:KeyInfo/>" + end, "Unexpected elements after SubjectConfirmationData/KeyInfo"},
                            {end, "text" + end, "Unexpected elements after SubjectConfirmationData/KeyInfo"},
                            {end, end + "<saml:NameID/>", "Unexpected elements after SubjectConfirmationData"},
                            {"<ds:KeyInfo>", "<saml:Extra/><ds:KeyInfo>", NotFound("KeyInfo")},
                            {"<saml:SubjectConfirmationData", "<saml:SubjectConfirmationData xmlns:saml=\"urn:other\"",
                             "Element 'saml:SubjectConfirmationData' has unexpected namespace"},
                        });
}

TEST(AssertionRefusals, KeyInfoOfHolderOfKey) {
  const std::string keyInfo = "<ds:KeyInfo>";
  const std::string data = "<ds:X509Data>";
  const std::string certificate = "<ds:X509Certificate>";
  ExpectRefusals(
      HolderOfKeyAssertion(),
      {
          {keyInfo, "<ds:KeyInfo Id=\"\">", "Unexpected attributes on element 'ds:KeyInfo'"},
          {keyInfo, "<ds:KeyInfo xmlns:ds=\"urn:other\">", "Element 'ds:KeyInfo' has unexpected namespace"},
          {keyInfo, "<ds:KeyInfo><ds:KeyName>x</ds:KeyName>", NotFound("X509Data")},
          {data, "<ds:X509Data Id=\"\">", "Unexpected attributes on element 'ds:X509Data'"},
          {data, "<ds:X509Data xmlns:ds=\"urn:other\">", "Element 'ds:X509Data' has unexpected namespace"},
          {data, "<ds:X509Data><ds:X509SubjectName>x</ds:X509SubjectName>", NotFound("X509Certificate")},
          {certificate, "<ds:X509Certificate Id=\"\">", "Unexpected attributes on element 'ds:X509Certificate'"},
          {certificate, "<ds:X509Certificate xmlns:ds=\"urn:other\">",
           "Element 'ds:X509Certificate' has unexpected namespace"},
          {certificate, "<ds:X509Certificate><b/>", OnlyText("ds:X509Certificate")},
          {"</ds:X509Certificate>", "</ds:X509Certificate><ds:X509Certificate/>",
           "Unexpected elements after X509Certificate"},
          {"</ds:X509Data>", "</ds:X509Data><ds:X509Data/>", "Unexpected elements after X509Data"},
      });
}

TEST(AssertionRefusals, CertificateThatDoesNotDecode) {
  const auto parseWith = [](const std::string &base64) {
    Parse(ReplaceOnce(HolderOfKeyAssertion(), HolderCertificateBase64(), base64));
  };
  const std::string start = "X509Certificate does not decode: ";
  const std::string truncated = HolderCertificateBase64().substr(0, 400);
  for (const std::string &base64 : std::vector<std::string>{"*", "AAA", "AAAA", truncated}) {
    try {
      parseWith(base64);
      ADD_FAILURE() << base64;
    } catch (const ParseException &error) {
      const std::string message = error.what();
      EXPECT_EQ(start, message.substr(0, start.size()));
      EXPECT_GT(message.size(), start.size());
    }
  }
}

TEST(AssertionRefusals, Conditions) {
  const std::string from = " NotBefore=\"2026-01-01T00:00:00Z\"";
  const std::string to = " NotOnOrAfter=\"2026-01-01T07:00:00Z\"";
  const std::string missing = "Node 'saml:Conditions is missing required attribute '";
  ExpectRefusals(BearerAssertion(),
                 {
                     {from, "", missing + "NotBefore'"},
                     {to, "", missing + "NotOnOrAfter'"},
                     {to, to + " Extra=\"\"", "Unexpected attributes on element 'saml:Conditions'"},
                     {from, " NotBefore=\"2026-02-30T00:00:00Z\"", "saml:Conditions/@NotBefore is not a date"},
                     {to, " NotOnOrAfter=\"2026-01-01\"", "saml:Conditions/@NotOnOrAfter is not a date"},
                     {"<saml:Conditions ", "<saml:Conditions xmlns:saml=\"urn:other\" ",
                      "Element 'saml:Conditions' has unexpected namespace"},
                 });
}

TEST(AssertionRefusals, UnknownAndDuplicateRestrictions) {
  const std::string proxy = Piece::PROXY_RESTRICTION;
  const std::string renew = Piece::RENEW_RESTRICTION;
  ExpectRefusals(BearerAssertion(),
                 {
                     {proxy, Twice(proxy), UNKNOWN_RESTRICTION + ": saml:ProxyRestriction"},
                     {renew, Twice(renew), UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {Piece::DelegationRestriction(), Twice(Piece::DelegationRestriction()),
                      UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {Piece::AudienceRestriction(), Twice(Piece::AudienceRestriction()),
                      UNKNOWN_RESTRICTION + ": saml:AudienceRestriction"},
                     {proxy, "<saml:OneTimeUse/>", UNKNOWN_RESTRICTION + ": saml:OneTimeUse"},
                     {proxy, "<ProxyRestriction/>", UNKNOWN_RESTRICTION + ": ProxyRestriction"},
                     {proxy, "<saml:Condition/>", UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {"<saml:Condition xsi:type=\"rsa:RenewRestrictionType\"",
                      "<saml:Condition xmlns:saml=\"urn:other\" xsi:type=\"rsa:RenewRestrictionType\"",
                      UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {"<saml:Condition xsi:type=\"del:DelegationRestrictionType\"",
                      "<saml:Condition xmlns:saml=\"urn:other\" xsi:type=\"del:DelegationRestrictionType\"",
                      UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {"<saml:AudienceRestriction>", "<saml:AudienceRestriction xmlns:saml=\"urn:other\">",
                      UNKNOWN_RESTRICTION + ": saml:AudienceRestriction"},
                     {"<saml:ProxyRestriction ", "<saml:ProxyRestriction xmlns:saml=\"urn:other\" ",
                      UNKNOWN_RESTRICTION + ": saml:ProxyRestriction"},
                     {proxy, "<saml:Condition xsi:type=\"rsa:OtherType\"/>", UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {proxy, "text", UNKNOWN_RESTRICTION},
                     {proxy, "<?pi?>", UNKNOWN_RESTRICTION},
                 });
}

TEST(AssertionRefusals, ConditionWhoseTypeUsesAnUndefinedPrefix) {
  const std::string valid = BearerAssertion();
  const std::size_t column = valid.find("<saml:ProxyRestriction") + 1;
  ExpectRefusals(valid, {{Piece::PROXY_RESTRICTION, "<saml:Condition xsi:type=\"p:T\"/>",
                          "Element saml:Conditionat 1," + std::to_string(column) + " uses undefined prefix: `p'"}});
}

TEST(AssertionRefusals, DelegationRestriction) {
  const std::string type = "xsi:type=\"del:DelegationRestrictionType\"";
  const std::string first = "<del:Delegate DelegationInstant=\"2026-01-01T00:00:01Z\">";
  const std::string name = "<saml:NameID Format=\"urn:format:last\">backup@corp</saml:NameID>";
  ExpectRefusals(BearerAssertion(),
                 {
                     {type, type + " Count=\"1\"", "Unexpected attribute 'Count' on element 'saml:Condition'"},
                     {Piece::DELEGATES, "", NotFound("Delegate")},
                     {Piece::DELEGATES, std::string(Piece::DELEGATES) + "<del:Other/>", NotFound("Delegate")},
                     {Piece::DELEGATES, std::string(Piece::DELEGATES) + "text", NotFound("Delegate")},
                     {first, "<del:Delegate xmlns:del=\"urn:other\" DelegationInstant=\"2026-01-01T00:00:01Z\">",
                      "Element 'del:Delegate' has unexpected namespace"},
                     {first, "<del:Delegate>", "Node 'del:Delegate is missing required attribute 'DelegationInstant'"},
                     {first, "<del:Delegate DelegationInstant=\"\">", "del:Delegate/@DelegationInstant is not a date"},
                     {first, "<del:Delegate ConfirmationMethod=\"\" DelegationInstant=\"2026-01-01T00:00:01Z\">",
                      "Unexpected attributes on element 'del:Delegate'"},
                     {name, "", NotFound("NameID")},
                     {name, Twice(name), "Unexpected elements after Delegate/NameID"},
                     {" Format=\"urn:format:last\"", "", "Node 'saml:NameID is missing required attribute 'Format'"},
                 });
}

TEST(AssertionRefusals, AudienceRestriction) {
  const std::string start = "<saml:AudienceRestriction>";
  ExpectRefusals(
      BearerAssertion(),
      {
          {start, "<saml:AudienceRestriction ID=\"\">", "Unexpected attributes on element 'saml:AudienceRestriction'"},
          {Piece::AUDIENCES, "", NotFound("Audience")},
          {start, start + "<saml:Other/>", NotFound("Audience")},
          {start, start + "<Audience>x</Audience>", "Element 'Audience' has unexpected namespace"},
          {start, start + "<saml:Audience/>", OnlyText("saml:Audience")},
          {start, start + "<saml:Audience ID=\"\">x</saml:Audience>",
           "Unexpected attributes on element 'saml:Audience'"},
      });
}

TEST(AssertionRefusals, ProxyAndRenewRestriction) {
  const std::string proxy = Piece::PROXY_RESTRICTION;
  const std::string renew = Piece::RENEW_RESTRICTION;
  ExpectRefusals(
      BearerAssertion(),
      {
          {proxy, "<saml:ProxyRestriction Count=\"-1\"/>",
           "saml:ProxyRestriction/@Count is not a non-negative integer."},
          {proxy, "<saml:ProxyRestriction Count=\"\"/>", "saml:ProxyRestriction/@Count is not a non-negative integer."},
          {proxy, "<saml:ProxyRestriction Extra=\"\"/>", "Unexpected attributes on element 'saml:ProxyRestriction'"},
          {proxy, "<saml:ProxyRestriction><saml:Audience>x</saml:Audience></saml:ProxyRestriction>",
           "Element 'saml:ProxyRestriction' must be empty"},
          {renew, "<saml:Condition xsi:type=\"rsa:RenewRestrictionType\" Count=\"many\"/>",
           "saml:Condition/@Count is not a non-negative integer."},
          {renew, "<saml:Condition xsi:type=\"rsa:RenewRestrictionType\" Extra=\"\"/>",
           "Unexpected attribute 'Extra' on element 'saml:Condition'"},
          {renew, "<saml:Condition xsi:type=\"rsa:RenewRestrictionType\">text</saml:Condition>",
           "Element 'saml:Condition' must be empty"},
      });
}

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
