// SPDX-License-Identifier: Apache-2.0
// How the parsers of the elements below an assertion continue after deviations.
#include "unit/token/assertion_refusals.h"
#include "unit/token/assertion_text.h"
#include "unit/token/recovered_assertion.h"

#include <tarvel/crypto/certificate.h>

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;

const std::string UNKNOWN_RESTRICTION = "Unknown or duplicate restriction node under Conditions";

RecoveredAssertion Recover(const std::string &from, const std::string &to) {
  return RecoveredAssertion(ReplaceOnce(BearerAssertion(), from, to));
}

RecoveredAssertion RecoverHolderOfKey(const std::string &from, const std::string &to) {
  return RecoveredAssertion(ReplaceOnce(HolderOfKeyAssertion(), from, to));
}

TEST(SignatureRecovery, ReadsTheSignatureAfterOtherElements) {
  const std::string column = std::to_string(BearerAssertion().find(Piece::SIGNATURE) + 1);
  const RecoveredAssertion recovered = Recover(Piece::SIGNATURE, "<x/>text<y/>" + std::string(Piece::SIGNATURE));
  EXPECT_EQ((Messages{"Signature syntax error: Expected ds:Signature, found \"x\" at line 1, column " + column + " | x",
                      "Expected element ds:Signature not found | saml:Assertion",
                      "Expected element ds:Signature not found | y"}),
            recovered.Messages());
  EXPECT_TRUE(recovered.record.Signature);
  EXPECT_EQ("alice@corp", recovered.record.Subject.NameID.value);
}

TEST(SignatureRecovery, ReadsTheOtherElementsOfAnAssertionWithoutSignature) {
  const RecoveredAssertion recovered = Recover(Piece::SIGNATURE, "");
  ASSERT_EQ(1u, recovered.deviations.size());
  EXPECT_EQ("saml:Subject", recovered.deviations[0].element);
  EXPECT_EQ("element ds:Signature", recovered.deviations[0].allowed);
  EXPECT_EQ("element saml:Subject", recovered.deviations[0].found);
  EXPECT_FALSE(recovered.record.Signature);
  EXPECT_EQ("alice@corp", recovered.record.Subject.NameID.value);
}

TEST(SignatureRecovery, SkipsASignatureThatCannotBeRead) {
  const RecoveredAssertion recovered = Recover(Piece::SIGNATURE, "<ds:Signature/>");
  ASSERT_EQ(1u, recovered.deviations.size());
  EXPECT_EQ("ds:Signature", recovered.deviations[0].element);
  EXPECT_FALSE(recovered.record.Signature);
  EXPECT_EQ("alice@corp", recovered.record.Subject.NameID.value);
}

TEST(SignatureRecovery, KeepsASignatureThatDoesNotCoverTheAssertion) {
  const RecoveredAssertion recovered = Recover("URI=\"#_a1\"", "URI=\"#_other\"");
  EXPECT_EQ(
      (std::vector<ExpectedDeviation>{{"Token's signature must cover the entire token", "ds:Signature", "",
                                       "a reference to the assertion's ID, or to the whole document", "\"#_other\""}}),
      recovered.deviations);
  EXPECT_TRUE(recovered.record.Signature);
}

TEST(SubjectRecovery, SkipsAnIdentifierOfAnotherKind) {
  const RecoveredAssertion recovered = Recover(Piece::SUBJECT_NAME, "<saml:EncryptedID/>");
  EXPECT_EQ(
      (Messages{NotFound("NameID") + " | saml:EncryptedID", NotFound("SubjectConfirmation") + " | saml:EncryptedID"}),
      recovered.Messages());
  EXPECT_FALSE(recovered.record.Subject.NameID.element);
  EXPECT_TRUE(recovered.record.Subject.SubjectConfirmation.element);
}

TEST(SubjectRecovery, ReadsTheFirstOfSeveralConfirmations) {
  const std::string second = Piece::Confirmation("holder-of-key", Piece::HolderOfKeyData());
  const RecoveredAssertion recovered = Recover("</saml:Subject>", second + second + "</saml:Subject>");
  const std::string message = "Unexpected elements after SubjectConfirmation | saml:SubjectConfirmation";
  EXPECT_EQ((Messages{message, message}), recovered.Messages());
  EXPECT_EQ(SamlToken::BEARER, recovered.record.Subject.SubjectConfirmation.Method);
  EXPECT_FALSE(recovered.record.Subject.SubjectConfirmation.SubjectConfirmationData.certificate);
}

TEST(SubjectRecovery, LeavesOutTheTextOfANameWithExtraContent) {
  const RecoveredAssertion recovered = Recover("alice@corp", "alice<b/>");
  EXPECT_EQ((Messages{OnlyText("saml:NameID") + " | saml:NameID"}), recovered.Messages());
  EXPECT_EQ((NameIDType{"urn:format:subject", ""}), recovered.record.Subject.NameID);
  EXPECT_TRUE(recovered.record.Subject.NameID.element);
}

constexpr const char *BEARER = "Method=\"urn:oasis:names:tc:SAML:2.0:cm:bearer\"";
constexpr const char *HOLDER_OF_KEY = "Method=\"urn:oasis:names:tc:SAML:2.0:cm:holder-of-key\"";

TEST(ConfirmationRecovery, ReadsTheDateOfAnUnknownMethod) {
  const RecoveredAssertion recovered = Recover(BEARER, "Method=\"urn:other\"");
  EXPECT_EQ(
      (std::vector<ExpectedDeviation>{
          {"Unknown subject confirmation method: 'urn:other'", "saml:SubjectConfirmation", "Method",
           "urn:oasis:names:tc:SAML:2.0:cm:bearer or urn:oasis:names:tc:SAML:2.0:cm:holder-of-key", "urn:other"}}),
      recovered.deviations);
  const SubjectConfirmationType &confirmation = recovered.record.Subject.SubjectConfirmation;
  EXPECT_EQ("urn:other", confirmation.writtenMethod.value());
  EXPECT_FALSE(confirmation.isMethodKnown);
  EXPECT_EQ(DateTime("2026-01-01T08:00:00Z"), confirmation.SubjectConfirmationData.NotOnOrAfter);
}

TEST(ConfirmationRecovery, ReadsTheCertificateOfAnUnknownMethod) {
  const RecoveredAssertion recovered = RecoverHolderOfKey(HOLDER_OF_KEY, "Method=\"urn:other\"");
  EXPECT_EQ((Messages{"Unknown subject confirmation method: 'urn:other' | saml:SubjectConfirmation"}),
            recovered.Messages());
  EXPECT_TRUE(recovered.record.Subject.SubjectConfirmation.SubjectConfirmationData.certificate);
  EXPECT_EQ(SamlToken::BEARER, recovered.record.Subject.SubjectConfirmation.Method);
}

TEST(ConfirmationRecovery, ReportsAMissingMethodOnce) {
  const RecoveredAssertion recovered = Recover(BEARER, "");
  EXPECT_EQ((Messages{"Node 'saml:SubjectConfirmation is missing required attribute 'Method' | "
                      "saml:SubjectConfirmation"}),
            recovered.Messages());
  EXPECT_FALSE(recovered.record.Subject.SubjectConfirmation.writtenMethod);
  EXPECT_FALSE(recovered.record.Subject.SubjectConfirmation.isMethodKnown);
}

TEST(ConfirmationRecovery, StatesTheMethodOfHolderOfKey) {
  const RecoveredAssertion recovered(HolderOfKeyAssertion());
  const SubjectConfirmationType &confirmation = recovered.record.Subject.SubjectConfirmation;
  EXPECT_EQ(SamlToken::HOLDER_OF_KEY, confirmation.Method);
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:cm:holder-of-key", confirmation.writtenMethod.value());
  EXPECT_TRUE(confirmation.isMethodKnown);
}

TEST(ConfirmationRecovery, ReadsBearerDataWithContentAndFurtherAttributes) {
  const std::string place = " | saml:SubjectConfirmationData";
  const RecoveredAssertion recovered =
      Recover(Piece::BEARER_DATA, "<saml:SubjectConfirmationData Recipient=\"urn:r\" InResponseTo=\"_1\" "
                                  "NotOnOrAfter=\"2026-01-01T08:00:00Z\"><x/><y/></saml:SubjectConfirmationData>");
  const std::string unexpected = "Unexpected attributes on element 'saml:SubjectConfirmationData'" + place;
  EXPECT_EQ((Messages{unexpected, unexpected, "Element 'saml:SubjectConfirmationData' must be empty" + place}),
            recovered.Messages());
  EXPECT_EQ(DateTime("2026-01-01T08:00:00Z"),
            recovered.record.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter);
}

TEST(ConfirmationRecovery, ReadsAKeyWithoutType) {
  const RecoveredAssertion recovered = RecoverHolderOfKey(" xsi:type=\"saml:KeyInfoConfirmationDataType\"", "");
  EXPECT_EQ((Messages{"Node 'saml:SubjectConfirmationData is missing required attribute "
                      "'{http://www.w3.org/2001/XMLSchema-instance}type' | saml:SubjectConfirmationData"}),
            recovered.Messages());
  EXPECT_TRUE(recovered.record.Subject.SubjectConfirmation.SubjectConfirmationData.certificate);
}

TEST(ConfirmationRecovery, ReportsATypeWithUnboundPrefixOnce) {
  const RecoveredAssertion recovered = RecoverHolderOfKey("xsi:type=\"saml:Key", "xsi:type=\"p:Key");
  ASSERT_EQ(1u, recovered.deviations.size());
  EXPECT_EQ("xsi:type", recovered.deviations[0].attribute);
  EXPECT_EQ("p:KeyInfoConfirmationDataType", recovered.deviations[0].found);
  EXPECT_TRUE(recovered.record.Subject.SubjectConfirmation.SubjectConfirmationData.certificate);
}

TEST(ConfirmationRecovery, ReadsTheCertificateBetweenOtherElements) {
  const RecoveredAssertion recovered = RecoveredAssertion(ReplaceOnce(
      ReplaceOnce(HolderOfKeyAssertion(), "<ds:X509Data>", "<ds:KeyName/><ds:X509Data><ds:X509SubjectName/>"),
      "</ds:X509Data>", "<ds:X509SKI/></ds:X509Data><ds:KeyValue/>"));
  EXPECT_EQ((Messages{NotFound("X509Data") + " | ds:KeyName", NotFound("X509Certificate") + " | ds:X509SubjectName",
                      "Unexpected elements after X509Certificate | ds:X509SKI",
                      "Unexpected elements after X509Data | ds:KeyValue"}),
            recovered.Messages());
  EXPECT_TRUE(recovered.record.Subject.SubjectConfirmation.SubjectConfirmationData.certificate);
}

TEST(ConfirmationRecovery, HasNoCertificateWhenTheTextDoesNotDecode) {
  for (const std::string base64 : {"*", "AAAA"}) {
    const RecoveredAssertion recovered = RecoverHolderOfKey(HolderCertificateBase64(), base64);
    ASSERT_EQ(1u, recovered.deviations.size()) << base64;
    EXPECT_EQ("ds:X509Certificate", recovered.deviations[0].element);
    EXPECT_EQ("an X.509 certificate in DER, in Base64", recovered.deviations[0].allowed);
    EXPECT_FALSE(recovered.record.Subject.SubjectConfirmation.SubjectConfirmationData.certificate);
  }
}

TEST(ConfirmationRecovery, ReportsACertificateWithoutTextOnce) {
  const RecoveredAssertion recovered = RecoverHolderOfKey(HolderCertificateBase64(), "<b/>");
  EXPECT_EQ((Messages{OnlyText("ds:X509Certificate") + " | ds:X509Certificate"}), recovered.Messages());
}

TEST(ConditionsRecovery, ReadsTheOtherDateWhenOneIsMissing) {
  const RecoveredAssertion recovered = Recover(" NotBefore=\"2026-01-01T00:00:00Z\"", "");
  EXPECT_EQ((Messages{"Node 'saml:Conditions is missing required attribute 'NotBefore' | saml:Conditions"}),
            recovered.Messages());
  EXPECT_EQ(DateTime(), recovered.record.Conditions.NotBefore);
  EXPECT_EQ(DateTime("2026-01-01T07:00:00Z"), recovered.record.Conditions.NotOnOrAfter);
}

TEST(ConditionsRecovery, ReportsATextThatIsNotADateOnce) {
  const RecoveredAssertion recovered = Recover(" NotBefore=\"2026-01-01T00:00:00Z\"", " NotBefore=\"now\"");
  EXPECT_EQ((Messages{"saml:Conditions/@NotBefore is not a date | saml:Conditions"}), recovered.Messages());
  EXPECT_EQ(DateTime(), recovered.record.Conditions.NotBefore);
}

TEST(ConditionsRecovery, SkipsUnknownAndDuplicateRestrictions) {
  const std::string other = "<saml:OneTimeUse/>text<saml:Condition xsi:type=\"rsa:Other\"/>";
  const RecoveredAssertion recovered =
      Recover(Piece::AllConditions(),
              Piece::Conditions(other + Twice(Piece::DelegationRestriction()) + Twice(Piece::PROXY_RESTRICTION) +
                                Twice(Piece::RENEW_RESTRICTION) + "<saml:Condition xsi:type=\"p:T\"/>"));
  EXPECT_EQ(
      (Messages{UNKNOWN_RESTRICTION + ": saml:OneTimeUse | saml:OneTimeUse", UNKNOWN_RESTRICTION + " | saml:Conditions",
                UNKNOWN_RESTRICTION + ": saml:Condition | saml:Condition",
                UNKNOWN_RESTRICTION + ": saml:Condition | saml:Condition",
                UNKNOWN_RESTRICTION + ": saml:ProxyRestriction | saml:ProxyRestriction",
                UNKNOWN_RESTRICTION + ": saml:Condition | saml:Condition",
                // Its type is not compared with any, because both kinds have been read.
                UNKNOWN_RESTRICTION + ": saml:Condition | saml:Condition"}),
      recovered.Messages());
  EXPECT_EQ(2u, recovered.record.Conditions.DelegationRestriction->delegates.size());
  EXPECT_EQ(3u, recovered.record.Conditions.ProxyRestriction->Count.value());
}

TEST(ConditionsRecovery, ReportsAnUnboundTypeOnce) {
  const RecoveredAssertion recovered = Recover(Piece::PROXY_RESTRICTION, "<saml:Condition xsi:type=\"p:T\"/>");
  ASSERT_EQ(1u, recovered.deviations.size());
  EXPECT_EQ("saml:Condition", recovered.deviations[0].element);
  EXPECT_EQ("xsi:type", recovered.deviations[0].attribute);
  EXPECT_TRUE(recovered.record.Conditions.RenewRestriction);
}

TEST(ConditionsRecovery, KeepsAllAudiencesThatCanBeRead) {
  const RecoveredAssertion recovered =
      Recover(Piece::AudienceRestriction(),
              "<saml:AudienceRestriction/><saml:AudienceRestriction ID=\"1\"><x/><saml:Audience><y/></saml:Audience>"
              "<saml:Audience>urn:z</saml:Audience></saml:AudienceRestriction>");
  EXPECT_EQ((Messages{NotFound("Audience") + " | saml:AudienceRestriction",
                      UNKNOWN_RESTRICTION + ": saml:AudienceRestriction | saml:AudienceRestriction",
                      "Unexpected attributes on element 'saml:AudienceRestriction' | saml:AudienceRestriction",
                      NotFound("Audience") + " | x", OnlyText("saml:Audience") + " | saml:Audience"}),
            recovered.Messages());
  EXPECT_EQ((std::set<std::string>{"urn:z"}), recovered.record.Conditions.AudienceRestriction->audiences);
}

TEST(ConditionsRecovery, ReadsDelegatesBetweenOtherElements) {
  const RecoveredAssertion recovered =
      Recover(Piece::DELEGATES, "<x/>" + std::string(Piece::DELEGATES) + "<del:Delegate/><y/>");
  EXPECT_EQ((Messages{NotFound("Delegate") + " | x",
                      "Node 'del:Delegate is missing required attribute 'DelegationInstant' | del:Delegate",
                      NotFound("NameID") + " | del:Delegate", NotFound("Delegate") + " | y"}),
            recovered.Messages());
  EXPECT_EQ(3u, recovered.record.Conditions.DelegationRestriction->delegates.size());
}

TEST(StatementRecovery, ReadsAdviceAndAttributesBetweenOtherElements) {
  const std::string x = "<x/>";
  std::string text = ReplaceOnce(BearerAssertion(), Piece::RSA_ADVICE, x + Piece::RSA_ADVICE + "text");
  text = ReplaceOnce(text, "<saml:Attribute Name=\"color\">", x + "<saml:Attribute Name=\"color\">" + x);
  text = ReplaceOnce(text, Piece::ATTRIBUTES, x + Piece::ATTRIBUTES + "<saml:Attribute/>");
  const RecoveredAssertion recovered(text);
  EXPECT_EQ(
      (Messages{NotFound("RSAAdvice") + " | x", NotFound("Attribute") + " | x", NotFound("AttributeValue") + " | x",
                NotFound("RSAAdvice") + " | saml:Advice", NotFound("Attribute") + " | x",
                "Node 'saml:Attribute is missing required attribute 'Name' | saml:Attribute"}),
      recovered.Messages());
  ASSERT_EQ(2u, recovered.record.Advice->advice.size());
  ASSERT_EQ(2u, recovered.record.Advice->advice[0].attributes.size());
  EXPECT_EQ((std::vector<std::string>{"green", "blue"}), recovered.record.Advice->advice[0].attributes[0].values);
  EXPECT_EQ(3u, recovered.record.AttributeStatement->attributes.size());
}

TEST(StatementRecovery, LeavesOutValuesThatCannotBeRead) {
  const RecoveredAssertion recovered =
      Recover("<saml:AttributeValue>first<", "<saml:AttributeValue/><saml:AttributeValue p:q=\"\">third<");
  EXPECT_EQ(2u, recovered.deviations.size());
  EXPECT_EQ((std::vector<std::string>{"third", "second"}), recovered.record.AttributeStatement->attributes[0].values);
}

TEST(StatementRecovery, ReadsTheClassOfTheContextAfterOtherElements) {
  const RecoveredAssertion recovered = Recover("<saml:AuthnContext>" + std::string(Piece::CLASS_REF),
                                               "<saml:SubjectLocality/><saml:AuthnContext><saml:AuthnContextDecl/>" +
                                                   std::string(Piece::CLASS_REF) + "<x/>");
  EXPECT_EQ((Messages{NotFound("AuthnContext") + " | saml:SubjectLocality",
                      NotFound("AuthnContextClassRef") + " | saml:AuthnContextDecl",
                      "Unexpected elements after AuthnContextClassRef | x"}),
            recovered.Messages());
  EXPECT_EQ("urn:class", recovered.record.AuthnStatement.AuthnContext.AuthnContextClassRef);
}

} // namespace
