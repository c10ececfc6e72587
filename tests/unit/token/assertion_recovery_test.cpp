// SPDX-License-Identifier: Apache-2.0
// How the parser continues after deviations: it reports each once, and still reads what follows.
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

using Deviations = std::vector<ExpectedDeviation>;

std::string Changed(const std::string &from, const std::string &to) {
  return ReplaceOnce(BearerAssertion(), from, to);
}

TEST(AssertionRecovery, ReportsNothingForAnAcceptedAssertion) {
  EXPECT_EQ(Messages{}, RecoveredAssertion(BearerAssertion()).Messages());
  EXPECT_EQ(Messages{}, RecoveredAssertion(HolderOfKeyAssertion()).Messages());
}

/// An assertion such as services of other makers issue by default.
std::string ForeignAssertion() {
  const std::string audience = "<saml:AudienceRestriction><saml:Audience>urn:";
  const std::string end = "</saml:Audience></saml:AudienceRestriction>";
  const std::string text = Assertion(
      {"<saml:Issuer>the issuer</saml:Issuer>", Piece::SIGNATURE,
       Piece::Subject("<saml:NameID Format=\"urn:format:subject\" NameQualifier=\"urn:q\">alice</saml:NameID>",
                      Piece::Confirmation("bearer", "")),
       Piece::Conditions(audience + "a" + end + audience + "b" + end), Piece::AttributeStatement()});
  return ReplaceOnce(text, " Version=\"2.0\"", " Version=\"2.0\" xsi:type=\"saml:AssertionType\"");
}

TEST(AssertionRecovery, ReportsEachDeviationOfAForeignAssertionOnce) {
  EXPECT_EQ((Deviations{
                {"Unexpected attributes on element 'saml:Assertion'", "saml:Assertion", "xsi:type",
                 "Version, ID, IssueInstant", "saml:AssertionType"},
                {"Node 'saml:Issuer is missing required attribute 'Format'", "saml:Issuer", "Format", "Format", ""},
                {"Unexpected attributes on element 'saml:NameID'", "saml:NameID", "NameQualifier", "Format", "urn:q"},
                {"Expected element 'SubjectConfirmationData' not found.", "saml:SubjectConfirmation", "",
                 "element saml:SubjectConfirmationData", ""},
                {"Unknown or duplicate restriction node under Conditions: saml:AudienceRestriction",
                 "saml:AudienceRestriction", "",
                 "saml:AudienceRestriction, saml:ProxyRestriction, and saml:Condition of the types "
                 "del:DelegationRestrictionType and rsa:RenewRestrictionType, each at most once",
                 "element saml:AudienceRestriction"},
                {"Expected element 'AuthnStatement' not found.", "saml:AttributeStatement", "",
                 "element saml:AuthnStatement", "element saml:AttributeStatement"},
            }),
            RecoveredAssertion(ForeignAssertion()).deviations);
}

TEST(AssertionRecovery, ReadsAForeignAssertion) {
  const SamlAssertionType assertion = RecoveredAssertion(ForeignAssertion()).record;
  EXPECT_EQ("2.0", assertion.Version);
  EXPECT_EQ("_a1", assertion.ID);
  EXPECT_EQ(DateTime("2026-01-01T00:00:00Z"), assertion.IssueInstant);
  EXPECT_EQ((NameIDType{"", "the issuer"}), assertion.Issuer);
  EXPECT_TRUE(assertion.Signature);
  EXPECT_EQ((NameIDType{"urn:format:subject", "alice"}), assertion.Subject.NameID);
  const SubjectConfirmationType &confirmation = assertion.Subject.SubjectConfirmation;
  EXPECT_TRUE(confirmation.element);
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:cm:bearer", confirmation.writtenMethod.value());
  EXPECT_TRUE(confirmation.isMethodKnown);
  EXPECT_FALSE(confirmation.SubjectConfirmationData.element);
  EXPECT_EQ(DateTime(), confirmation.SubjectConfirmationData.NotOnOrAfter);
  EXPECT_EQ(DateTime("2026-01-01T07:00:00Z"), assertion.Conditions.NotOnOrAfter);
  EXPECT_EQ((std::set<std::string>{"urn:a", "urn:b"}), assertion.Conditions.AudienceRestriction->audiences);
  EXPECT_EQ(2u, assertion.AttributeStatement->attributes.size());
}

TEST(AssertionRecovery, RecordsTheElementsOfNamesAndAttributes) {
  const RecoveredAssertion recovered(BearerAssertion());
  const SamlAssertionType &assertion = recovered.record;
  const auto nameOf = [](const Tarvel::Xml::ElementNode *element) { return std::string(element->GetName()); };
  EXPECT_EQ(&recovered.document.Root(), assertion.element);
  EXPECT_EQ("saml:Issuer", nameOf(assertion.Issuer.element));
  EXPECT_EQ(&recovered.document.Child("Conditions"), assertion.Conditions.element);
  EXPECT_EQ(recovered.document.Child("Subject").GetFirstChild(), assertion.Subject.NameID.element);
  const SubjectConfirmationType &confirmation = assertion.Subject.SubjectConfirmation;
  EXPECT_EQ("saml:SubjectConfirmation", nameOf(confirmation.element));
  EXPECT_EQ(confirmation.element->GetFirstChild(), confirmation.NameID->element);
  EXPECT_EQ("saml:SubjectConfirmationData", nameOf(confirmation.SubjectConfirmationData.element));
  const DelegateType &delegate = assertion.Conditions.DelegationRestriction->delegates[1];
  EXPECT_EQ("del:Delegate", nameOf(Tarvel::Xml::AsElement(delegate.NameID.element->GetParent())));
  const std::vector<AttributeType> &attributes = assertion.AttributeStatement->attributes;
  EXPECT_EQ("urn:one", attributes[0].element->FindAttribute("", "Name")->GetValue());
  EXPECT_EQ("urn:two", attributes[1].element->FindAttribute("", "Name")->GetValue());
}

TEST(AssertionRecovery, ComparesNamesWithoutTheirElements) {
  const ParsedDocument document("<r/>");
  EXPECT_EQ((NameIDType{"f", "v", &document.Root()}), (NameIDType{"f", "v"}));
  EXPECT_NE((NameIDType{"f", "v"}), (NameIDType{"f", "w"}));
  EXPECT_NE((NameIDType{"f", "v"}), (NameIDType{"g", "v"}));
}

TEST(AssertionRecovery, ReportsWhatAnEmptyAssertionLacks) {
  const RecoveredAssertion recovered("<saml:Assertion xmlns:saml='urn:oasis:names:tc:SAML:2.0:assertion'/>");
  const std::string missing = "Node 'saml:Assertion is missing required attribute '";
  const std::string place = " | saml:Assertion";
  EXPECT_EQ((Messages{missing + "Version'" + place, missing + "ID'" + place, missing + "IssueInstant'" + place,
                      NotFound("Issuer") + place, "Expected element ds:Signature not found" + place,
                      NotFound("Subject") + place, NotFound("Conditions") + place, NotFound("AuthnStatement") + place}),
            recovered.Messages());
  EXPECT_EQ(&recovered.document.Root(), recovered.record.element);
  EXPECT_FALSE(recovered.record.Signature);
  EXPECT_FALSE(recovered.record.Issuer.element);
  EXPECT_FALSE(recovered.record.Subject.NameID.element);
  EXPECT_FALSE(recovered.record.Subject.SubjectConfirmation.element);
  EXPECT_FALSE(recovered.record.Conditions.element);
}

TEST(AssertionRecovery, ReadsElementsInAnotherOrder) {
  const std::string subject = Piece::BearerSubject();
  const std::string conditions = Piece::AllConditions();
  const RecoveredAssertion recovered(Changed(subject + conditions, conditions + subject));
  EXPECT_EQ((Messages{NotFound("Subject") + " | saml:Conditions", NotFound("Conditions") + " | saml:Advice"}),
            recovered.Messages());
  EXPECT_EQ("alice@corp", recovered.record.Subject.NameID.value);
  EXPECT_EQ(DateTime("2026-01-01T07:00:00Z"), recovered.record.Conditions.NotOnOrAfter);
  EXPECT_TRUE(recovered.record.Advice);
}

TEST(AssertionRecovery, SkipsUnknownElementsAndText) {
  const std::string conditions = Piece::AllConditions();
  const RecoveredAssertion recovered(Changed(conditions, "<saml:Extra/>text<more/>" + conditions));
  EXPECT_EQ((Messages{NotFound("Conditions") + " | saml:Extra", NotFound("Conditions") + " | saml:Assertion",
                      NotFound("Conditions") + " | more"}),
            recovered.Messages());
  EXPECT_EQ(DateTime("2026-01-01T07:00:00Z"), recovered.record.Conditions.NotOnOrAfter);
  EXPECT_EQ(2u, recovered.record.AttributeStatement->attributes.size());
}

TEST(AssertionRecovery, ReadsStatementsInAnotherOrder) {
  const std::string authn = Piece::AuthnStatement();
  const std::string attributes = Piece::AttributeStatement();
  const RecoveredAssertion recovered(Changed(authn + attributes, attributes + authn));
  EXPECT_EQ((Messages{NotFound("AuthnStatement") + " | saml:AttributeStatement"}), recovered.Messages());
  EXPECT_EQ("urn:class", recovered.record.AuthnStatement.AuthnContext.AuthnContextClassRef);
  EXPECT_EQ(2u, recovered.record.AttributeStatement->attributes.size());
}

TEST(AssertionRecovery, ReadsTheAttributesOfAllStatements) {
  const std::string authn = Piece::AuthnStatement();
  const std::string attributes = Piece::AttributeStatement();
  const RecoveredAssertion recovered(
      Changed(authn + attributes, attributes + authn + "<saml:AuthzDecisionStatement/>" + Twice(attributes)));
  EXPECT_EQ((Messages{NotFound("AuthnStatement") + " | saml:AttributeStatement",
                      NotFound("AttributeStatement") + " | saml:AuthzDecisionStatement",
                      "Unexpected elements under Assertion | saml:AttributeStatement"}),
            recovered.Messages());
  EXPECT_EQ(6u, recovered.record.AttributeStatement->attributes.size());
}

TEST(AssertionRecovery, ReadsAnAdviceThatIsNotInItsPlace) {
  const std::string advice = Piece::Advice();
  const std::string authn = Piece::AuthnStatement();
  const std::string attributes = Piece::AttributeStatement();
  for (const std::string &order : {"<x/>" + advice + authn + attributes, authn + advice + attributes,
                                   authn + attributes + advice, "<x/>" + advice + attributes}) {
    const RecoveredAssertion recovered(Changed(advice + authn + attributes, order));
    ASSERT_TRUE(recovered.record.Advice) << order;
    EXPECT_EQ(2u, recovered.record.Advice->advice.size());
    EXPECT_EQ(2u, recovered.record.AttributeStatement->attributes.size());
  }
}

TEST(AssertionRecovery, ReadsOnlyTheFirstAdvice) {
  const RecoveredAssertion recovered(Changed(Piece::Advice(), Piece::Advice() + "<saml:Advice/>"));
  EXPECT_EQ((Messages{NotFound("AuthnStatement") + " | saml:Advice"}), recovered.Messages());
  EXPECT_EQ(2u, recovered.record.Advice->advice.size());
}

TEST(AssertionRecovery, ReportsTextBeforeTheAttributeStatementOnce) {
  const RecoveredAssertion recovered(Changed(Piece::AttributeStatement(), "text" + Piece::AttributeStatement()));
  EXPECT_EQ((Messages{"Unexpected elements under Assertion | saml:Assertion"}), recovered.Messages());
  EXPECT_EQ(2u, recovered.record.AttributeStatement->attributes.size());
}

TEST(AssertionRecovery, HasNoAttributeStatementWhenThereIsOnlyAnotherStatement) {
  const RecoveredAssertion recovered(Changed(Piece::AttributeStatement(), "<saml:AuthzDecisionStatement/>"));
  EXPECT_EQ((Messages{NotFound("AttributeStatement") + " | saml:AuthzDecisionStatement"}), recovered.Messages());
  EXPECT_FALSE(recovered.record.AttributeStatement);
}

TEST(RecoveredRoot, IsTheFirstAssertionInsideAnotherElement) {
  const RecoveredAssertion recovered("<r><e><Assertion/></e><e>" + BearerAssertion() + "</e>" + HolderOfKeyAssertion() +
                                     "</r>");
  EXPECT_EQ((Messages{NotFound("Assertion") + " | r"}), recovered.Messages());
  EXPECT_EQ("alice@corp", recovered.record.Subject.NameID.value);
  EXPECT_EQ("saml:Assertion", recovered.record.element->GetName());
  EXPECT_TRUE(recovered.record.AttributeStatement);
}

TEST(RecoveredRoot, IsAnAssertionElementOfAnotherNamespaceIfThereIsNoSamlAssertion) {
  const RecoveredAssertion recovered("<r><e/><Assertion ID='1'/><Assertion/></r>");
  EXPECT_EQ("1", recovered.record.ID);
  EXPECT_EQ(&recovered.document.Child("Assertion"), recovered.record.element);
  const RecoveredAssertion root("<Assertion ID='2'/>");
  EXPECT_EQ("Element 'Assertion' has unexpected namespace | Assertion", root.Messages().front());
  EXPECT_EQ(&root.document.Root(), root.record.element);
  const RecoveredAssertion inner("<Assertion ID='3'><e>" + BearerAssertion() + "</e></Assertion>");
  EXPECT_EQ((Messages{"Element 'Assertion' has unexpected namespace | Assertion"}), inner.Messages());
  EXPECT_EQ("_a1", inner.record.ID);
}

TEST(RecoveredRoot, IsNullInADocumentWithoutAssertions) {
  const RecoveredAssertion recovered("<r><e><f/></e>text</r>");
  EXPECT_EQ((Messages{NotFound("Assertion") + " | r"}), recovered.Messages());
  EXPECT_FALSE(recovered.record.element);
}

TEST(RecoveredRoot, IsNotSearchedForOutsideTheElement) {
  const ParsedDocument document("<r><e><f/></e>" + BearerAssertion() + "</r>");
  const Tarvel::Xml::ElementNode &e = document.Child("e");
  for (const Tarvel::Xml::Node *const node : {static_cast<const Tarvel::Xml::Node *>(&e), e.GetFirstChild()}) {
    NodeFilterIterator iterator = ParsedDocument::CursorOn(*node);
    SamlAssertionType assertion;
    RecordedDeviations sink;
    ParseSamlAssertionElement(iterator, assertion, sink);
    EXPECT_EQ(1u, sink.all.size());
    EXPECT_FALSE(assertion.element);
    EXPECT_EQ(node->GetNextSibling(), iterator.node);
  }
}

} // namespace
