// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_parser.h"

#include "unit/token/saml2_assertion.h"

#include <boost/optional/optional_io.hpp>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;
using ::testing::ElementsAre;
using ::testing::SizeIs;

const std::string XSI_LOCATIONS = R"(xsi:schemaLocation="urn:a a.xsd" xsi:noNamespaceSchemaLocation="b.xsd" )";

/// An assertion like those of a stock token service of Apache CXF.
std::string CxfAssertion() {
  return R"(<saml2:Assertion xmlns:saml2="urn:oasis:names:tc:SAML:2.0:assertion")"
         R"( xmlns:xsd="http://www.w3.org/2001/XMLSchema" xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance")"
         R"( xmlns:ds="http://www.w3.org/2000/09/xmldsig#" ID="_a1" IssueInstant="2026-01-01T00:00:00.000Z")"
         R"( Version="2.0" xsi:type="saml2:AssertionType"><saml2:Issuer>STSIssuer</saml2:Issuer>)" +
         std::string(Piece::SIGNATURE) +
         R"(<saml2:Subject><saml2:NameID Format="urn:oasis:names:tc:SAML:2.0:nameid-format:persistent")"
         R"( NameQualifier="http://cxf.apache.org/sts">alice</saml2:NameID>)"
         R"(<saml2:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:bearer"/></saml2:Subject>)"
         R"(<saml2:Conditions NotBefore="2026-01-01T00:00:00.000Z" NotOnOrAfter="2026-01-01T00:30:00.000Z">)"
         R"(<saml2:AudienceRestriction><saml2:Audience>https://a/</saml2:Audience></saml2:AudienceRestriction>)"
         R"(<saml2:AudienceRestriction><saml2:Audience>https://b/</saml2:Audience></saml2:AudienceRestriction>)"
         R"(</saml2:Conditions><saml2:AttributeStatement><saml2:Attribute Name="token-requestor")"
         R"( NameFormat="http://cxf.apache.org/sts"><saml2:AttributeValue xsi:type="xsd:string">authenticated)"
         R"(</saml2:AttributeValue></saml2:Attribute></saml2:AttributeStatement></saml2:Assertion>)";
}

TEST(ParseSaml2AssertionElement, ReadsAnAssertionOfAStockApacheCxfService) {
  const Accepted read = AcceptedSaml2(CxfAssertion());
  EXPECT_EQ((NameId{"STSIssuer", {}, {}, {}, {}}), read.details.issuer);
  EXPECT_EQ((NameId{"alice",
                    std::string("urn:oasis:names:tc:SAML:2.0:nameid-format:persistent"),
                    std::string("http://cxf.apache.org/sts"),
                    {},
                    {}}),
            read.details.subject);
  ASSERT_THAT(read.details.confirmations, SizeIs(1));
  EXPECT_EQ(SamlToken::BEARER, read.confirmations[0].type);
  EXPECT_EQ(nullptr, read.confirmations[0].data);
  EXPECT_THAT(read.details.audienceRestrictions,
              ElementsAre(std::set<std::string>{"https://a/"}, std::set<std::string>{"https://b/"}));
  EXPECT_TRUE(read.details.authnStatements.empty());
  ASSERT_TRUE(read.common.AttributeStatement);
  EXPECT_THAT(read.common.AttributeStatement->attributes[0].values, ElementsAre("authenticated"));
}

TEST(ParseSaml2AssertionElement, ReadsAnAssertionWithAllThatTheStrictProfileHas) {
  const Accepted read = AcceptedSaml2(BearerAssertion());
  EXPECT_EQ("2.0", read.common.Version);
  EXPECT_EQ("_a1", read.common.ID);
  EXPECT_EQ(DateTime("2026-01-01T00:00:00Z"), read.common.IssueInstant);
  EXPECT_EQ(DateTime("2026-01-01T00:00:00Z"), read.details.issueInstant);
  EXPECT_TRUE(read.common.Signature);
  EXPECT_TRUE(read.common.element);
}

TEST(ParseSaml2AssertionElement, AcceptsTheTypesOfTheSchemaAndLocationsOfSchemas) {
  for (const char *const name :
       {"Assertion", "Subject", "SubjectConfirmation", "SubjectConfirmationData", "Conditions", "AudienceRestriction",
        "ProxyRestriction", "Advice", "AuthnStatement", "AuthnContext", "AttributeStatement"}) {
    SCOPED_TRACE(name);
    const std::string start = std::string("<saml:") + name;
    const std::string typed = start + " xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance' " + XSI_LOCATIONS +
                              "xsi:type='saml:" + name + "Type'";
    std::string text = BearerAssertion();
    for (const char *const end : {" ", ">"}) {
      const std::size_t position = text.find(start + end);
      if (position != std::string::npos) {
        text.replace(position, start.size(), typed);
        break;
      }
    }
    // The assertion itself already declares the prefix.
    const std::string declaration = " xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance'";
    if (std::string(name) == "Assertion") {
      text = ReplaceOnce(text, declaration, "");
    }
    EXPECT_NE(BearerAssertion(), text);
    AcceptedSaml2(text);
  }
}

TEST(ParseSaml2AssertionElement, AcceptsTheTypesOfNamesAndUris) {
  AcceptedSaml2(ChangedBearer("<saml:Issuer ", "<saml:Issuer xsi:type='saml:NameIDType' "));
  AcceptedSaml2(ChangedBearer("<saml:NameID Format=\"urn:format:subject\"",
                              "<saml:NameID xsi:type='saml:NameIDType' Format=\"urn:format:subject\""));
  const std::string uri = " xmlns:xs='http://www.w3.org/2001/XMLSchema' xsi:type='xs:anyURI'>";
  AcceptedSaml2(ChangedBearer("<saml:Audience>https://a/", "<saml:Audience" + uri + "https://a/"));
  AcceptedSaml2(ChangedBearer("<saml:AuthnContextClassRef>", "<saml:AuthnContextClassRef" + uri));
}

TEST(ParseSaml2AssertionElement, AcceptsATypeInTheDefaultNamespace) {
  AcceptedSaml2(ChangedBearer("<saml:Subject>", "<saml:Subject xmlns='urn:oasis:names:tc:SAML:2.0:assertion' "
                                                "xsi:type='SubjectType'>"));
}

TEST(ParseSaml2AssertionElement, ReadsTheIssuerWithItsQualifiers) {
  const std::string issuer =
      "<saml:Issuer NameQualifier='n' SPNameQualifier='s' SPProvidedID='p'>the issuer</saml:Issuer>";
  const Accepted read = AcceptedSaml2(ChangedBearer(Piece::ISSUER, issuer));
  EXPECT_EQ((NameId{"the issuer", {}, std::string("n"), std::string("s"), std::string("p")}), read.details.issuer);
  EXPECT_EQ((NameIDType{"", "the issuer"}), read.common.Issuer);
}

TEST(ParseSaml2AssertionElement, AcceptsAnEmptyFormatOfTheIssuerLikeTheStrictProfile) {
  const Accepted read = AcceptedSaml2(ChangedBearer("urn:format:issuer", ""));
  EXPECT_EQ(std::string(), read.details.issuer.format);
}

TEST(ParseSaml2AssertionElement, ReadsTheNameOfTheSubjectExactly) {
  const Accepted read = AcceptedSaml2(
      ChangedBearer("<saml:NameID Format=\"urn:format:subject\">alice@corp",
                    "<saml:NameID Format='F' NameQualifier='N' SPNameQualifier='S' SPProvidedID='P'> Alice "));
  EXPECT_EQ((NameId{" Alice ", std::string("F"), std::string("N"), std::string("S"), std::string("P")}),
            read.details.subject);
  EXPECT_EQ((NameIDType{"F", " Alice "}), read.common.Subject.NameID);
  EXPECT_TRUE(read.common.Subject.NameID.element);
}

TEST(ParseSaml2AssertionElement, LeavesTheConfirmationOfTheSubjectToTheChecks) {
  const SubjectConfirmationType confirmation = AcceptedSaml2(BearerAssertion()).common.Subject.SubjectConfirmation;
  EXPECT_FALSE(confirmation.element);
  EXPECT_FALSE(confirmation.isMethodKnown);
}

TEST(ParseSaml2AssertionElement, ReadsTheDataOfABearerConfirmation) {
  const Accepted read = AcceptedSaml2(AssertionConfirmedBy(Piece::Confirmation(
      "bearer", "<saml:SubjectConfirmationData NotBefore='2026-01-01T00:00:01Z' NotOnOrAfter='2026-01-01T08:00:00Z' "
                "Recipient='https://r/' InResponseTo='_i' Address='192.0.2.1' xml:lang='en' xmlns:x='urn:x' x:any='1'>"
                "text<other/><x:more>text</x:more></saml:SubjectConfirmationData>")));
  ASSERT_THAT(read.details.confirmations, SizeIs(1));
  const ConfirmationDetails &details = read.details.confirmations[0];
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:cm:bearer", details.method);
  EXPECT_EQ(DateTime("2026-01-01T00:00:01Z"), details.notBefore.value());
  EXPECT_EQ(DateTime("2026-01-01T08:00:00Z"), details.notOnOrAfter.value());
  EXPECT_EQ(std::string("https://r/"), details.recipient);
  EXPECT_EQ(std::string("_i"), details.inResponseTo);
  EXPECT_EQ(std::string("192.0.2.1"), details.address);
  EXPECT_FALSE(details.nameId);
  EXPECT_EQ("saml:SubjectConfirmation", read.confirmations[0].element->GetName());
  EXPECT_EQ("saml:SubjectConfirmationData", read.confirmations[0].data->GetName());
  EXPECT_EQ(nullptr, read.confirmations[0].nameId);
}

TEST(ParseSaml2AssertionElement, ReadsABearerConfirmationWithEmptyData) {
  const Accepted read =
      AcceptedSaml2(AssertionConfirmedBy(Piece::Confirmation("bearer", "<saml:SubjectConfirmationData/>")));
  ASSERT_THAT(read.details.confirmations, SizeIs(1));
  EXPECT_FALSE(read.details.confirmations[0].notOnOrAfter);
  EXPECT_FALSE(read.details.confirmations[0].recipient);
  EXPECT_TRUE(read.confirmations[0].data);
}

TEST(ParseSaml2AssertionElement, ReadsTheNameOfTheConfirmingParty) {
  const Accepted read = AcceptedSaml2(
      AssertionConfirmedBy(Piece::Confirmation("bearer", "<saml:NameID SPNameQualifier='s'>backup</saml:NameID>")));
  ASSERT_THAT(read.details.confirmations, SizeIs(1));
  EXPECT_EQ((NameId{"backup", {}, {}, std::string("s"), {}}), read.details.confirmations[0].nameId.value());
  EXPECT_EQ("saml:NameID", read.confirmations[0].nameId->GetName());
}

TEST(ParseSaml2AssertionElement, ReadsAllConfirmationsInOrder) {
  const Accepted read = AcceptedSaml2(AssertionConfirmedBy(
      Piece::Confirmation("sender-vouches",
                          "<saml:SubjectConfirmationData Recipient='v'>any<ds:KeyInfo>text</ds:KeyInfo>"
                          "</saml:SubjectConfirmationData>") +
      "<saml:SubjectConfirmation Method='urn:other'/>" +
      Piece::Confirmation("holder-of-key", Piece::HolderOfKeyData()) + Piece::Confirmation("bearer", "")));
  ASSERT_THAT(read.details.confirmations, SizeIs(4));
  ASSERT_THAT(read.confirmations, SizeIs(4));
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:cm:sender-vouches", read.details.confirmations[0].method);
  EXPECT_EQ(std::string("v"), read.details.confirmations[0].recipient);
  EXPECT_FALSE(read.confirmations[0].type);
  EXPECT_EQ("urn:other", read.details.confirmations[1].method);
  EXPECT_FALSE(read.confirmations[1].type);
  EXPECT_EQ(SamlToken::HOLDER_OF_KEY, read.confirmations[2].type);
  EXPECT_TRUE(read.details.confirmations[2].certificate);
  EXPECT_EQ(SamlToken::BEARER, read.confirmations[3].type);
  EXPECT_TRUE(read.details.confirmations[3].publicKey.empty());
}

TEST(ParseSaml2AssertionElement, ReadsAsManyConfirmationsAsAreAllowed) {
  std::string confirmations;
  for (std::size_t i = 0; i < MAX_REPEATED_ELEMENTS; ++i) {
    confirmations += "<saml:SubjectConfirmation Method='m'/>";
  }
  EXPECT_THAT(AcceptedSaml2(AssertionConfirmedBy(confirmations)).confirmations, SizeIs(MAX_REPEATED_ELEMENTS));
}

TEST(ParseSaml2AssertionElement, ReadsConditionsWithoutAStartAsValidFromTheIssueInstant) {
  const Accepted read =
      AcceptedSaml2(ReplaceOnce(ReplaceOnce(AssertionUnder(""), "NotBefore=\"2026-01-01T00:00:00Z\" ", ""),
                                "IssueInstant=\"2026-01-01T00:00:00Z\"", "IssueInstant=\"2025-12-31T00:00:00Z\""));
  EXPECT_EQ(DateTime("2025-12-31T00:00:00Z"), read.common.Conditions.NotBefore);
  EXPECT_EQ(DateTime("2026-01-01T07:00:00Z"), read.common.Conditions.NotOnOrAfter);
}

TEST(ParseSaml2AssertionElement, ReadsEveryAudienceRestriction) {
  const Accepted read = AcceptedSaml2(AssertionUnder(
      Piece::AudienceRestriction() + "<saml:AudienceRestriction><saml:Audience>https://b/</saml:Audience>"
                                     "</saml:AudienceRestriction>"));
  EXPECT_THAT(read.details.audienceRestrictions,
              ElementsAre(std::set<std::string>{"https://a/", "https://b/"}, std::set<std::string>{"https://b/"}));
  EXPECT_FALSE(read.common.Conditions.AudienceRestriction);
}

TEST(ParseSaml2AssertionElement, ReadsOneTimeUse) {
  EXPECT_TRUE(AcceptedSaml2(AssertionUnder("<saml:OneTimeUse/>")).details.isOneTimeUse);
  EXPECT_FALSE(AcceptedSaml2(AssertionUnder("")).details.isOneTimeUse);
}

TEST(ParseSaml2AssertionElement, ReadsAProxyRestrictionWithAudiences) {
  const Accepted read = AcceptedSaml2(
      AssertionUnder("<saml:ProxyRestriction Count='2'><saml:Audience>b</saml:Audience><saml:Audience>a</saml:Audience>"
                     "</saml:ProxyRestriction>"));
  ASSERT_TRUE(read.details.proxyRestriction && read.common.Conditions.ProxyRestriction);
  EXPECT_EQ(2u, read.details.proxyRestriction->count.value());
  EXPECT_EQ(2u, read.common.Conditions.ProxyRestriction->Count.value());
  EXPECT_EQ((std::set<std::string>{"a", "b"}), read.details.proxyRestriction->audiences);
}

TEST(ParseSaml2AssertionElement, ReadsAProxyRestrictionWithoutACount) {
  const Accepted read = AcceptedSaml2(AssertionUnder("<saml:ProxyRestriction/>"));
  ASSERT_TRUE(read.details.proxyRestriction && read.common.Conditions.ProxyRestriction);
  EXPECT_FALSE(read.details.proxyRestriction->count);
  EXPECT_FALSE(read.common.Conditions.ProxyRestriction->Count);
}

TEST(ParseSaml2AssertionElement, ReadsDelegatesOfAnyFormatWithQualifiers) {
  const Accepted read =
      AcceptedSaml2(AssertionUnder("<saml:Condition xsi:type='del:DelegationRestrictionType'>"
                                   "<del:Delegate DelegationInstant='2026-01-01T00:00:01Z' ConfirmationMethod='urn:m'>"
                                   "<saml:NameID NameQualifier='n'>gateway</saml:NameID></del:Delegate>"
                                   "<del:Delegate xsi:type='del:DelegateType' DelegationInstant='2026-01-01T00:00:02Z'>"
                                   "<saml:NameID Format='f'>backup</saml:NameID></del:Delegate></saml:Condition>"));
  ASSERT_TRUE(read.common.Conditions.DelegationRestriction);
  const std::vector<DelegateType> &delegates = read.common.Conditions.DelegationRestriction->delegates;
  ASSERT_THAT(delegates, SizeIs(2));
  EXPECT_EQ(DateTime("2026-01-01T00:00:01Z"), delegates[0].DelegationInstant);
  EXPECT_EQ((NameIDType{"", "gateway"}), delegates[0].NameID);
  EXPECT_TRUE(delegates[0].NameID.element);
  EXPECT_EQ((NameIDType{"f", "backup"}), delegates[1].NameID);
}

TEST(ParseSaml2AssertionElement, ReadsARenewRestriction) {
  const Accepted read = AcceptedSaml2(AssertionUnder(Piece::RENEW_RESTRICTION));
  ASSERT_TRUE(read.common.Conditions.RenewRestriction);
  EXPECT_EQ(5u, read.common.Conditions.RenewRestriction->Count.value());
}

TEST(ParseSaml2AssertionElement, ReadsTheAdviceOfTheExtensionAndIgnoresOtherAdvice) {
  const Accepted read = AcceptedSaml2(AssertionStating(
      "<saml:Advice><saml:AssertionIDRef>_x</saml:AssertionIDRef><saml:AssertionURIRef>urn:x</saml:AssertionURIRef>"
      "<saml:Assertion/><saml:EncryptedAssertion/><any xmlns='urn:x'>text</any>" +
      std::string(Piece::RSA_ADVICE) + "</saml:Advice>"));
  ASSERT_TRUE(read.common.Advice);
  ASSERT_THAT(read.common.Advice->advice, SizeIs(2));
  EXPECT_EQ("urn:mapper", read.common.Advice->advice[0].source);
  EXPECT_EQ("urn:audit", read.common.Advice->advice[1].source);
  EXPECT_FALSE(AcceptedSaml2(AssertionStating("")).common.Advice);
}

TEST(ParseSaml2AssertionElement, ReadsAuthnStatementsWithAllTheirParts) {
  const Accepted read = AcceptedSaml2(AssertionStating(
      "<saml:AuthnStatement AuthnInstant='2026-01-01T00:00:03Z' SessionIndex='s' "
      "SessionNotOnOrAfter='2026-01-01T05:00:00Z'><saml:SubjectLocality Address='192.0.2.1' DNSName='host'/>"
      "<saml:AuthnContext><saml:AuthnContextClassRef>urn:class</saml:AuthnContextClassRef>"
      "<saml:AuthnContextDeclRef>urn:declaration</saml:AuthnContextDeclRef>"
      "<saml:AuthenticatingAuthority>urn:b</saml:AuthenticatingAuthority>"
      "<saml:AuthenticatingAuthority>urn:a</saml:AuthenticatingAuthority></saml:AuthnContext></saml:AuthnStatement>" +
      Piece::AuthnStatement()));
  ASSERT_THAT(read.details.authnStatements, SizeIs(2));
  const AuthnStatementDetails &first = read.details.authnStatements[0];
  EXPECT_EQ(DateTime("2026-01-01T00:00:03Z"), first.authnInstant);
  EXPECT_EQ(std::string("s"), first.sessionIndex);
  EXPECT_EQ(DateTime("2026-01-01T05:00:00Z"), first.sessionNotOnOrAfter.value());
  EXPECT_EQ(std::string("192.0.2.1"), first.localityAddress);
  EXPECT_EQ(std::string("host"), first.localityDnsName);
  EXPECT_EQ(std::string("urn:class"), first.contextClass);
  EXPECT_EQ(std::string("urn:declaration"), first.contextDeclaration);
  EXPECT_THAT(first.authenticatingAuthorities, ElementsAre("urn:b", "urn:a"));
  const AuthnStatementDetails &second = read.details.authnStatements[1];
  EXPECT_FALSE(second.sessionIndex || second.sessionNotOnOrAfter || second.localityAddress || second.localityDnsName ||
               second.contextDeclaration);
  EXPECT_EQ(std::string("urn:class"), second.contextClass);
}

TEST(ParseSaml2AssertionElement, ReadsAContextWithOnlyADeclaration) {
  const auto contextOf = [](const std::string &content) {
    const Accepted read =
        AcceptedSaml2(AssertionStating("<saml:AuthnStatement AuthnInstant='2026-01-01T00:00:03Z'><saml:AuthnContext>" +
                                       content + "</saml:AuthnContext></saml:AuthnStatement>"));
    EXPECT_THAT(read.details.authnStatements, SizeIs(1));
    return read.details.authnStatements.at(0);
  };
  const AuthnStatementDetails inside = contextOf("<saml:AuthnContextDecl any='1'>text<x/></saml:AuthnContextDecl>");
  EXPECT_FALSE(inside.contextClass || inside.contextDeclaration);
  const AuthnStatementDetails elsewhere = contextOf("<saml:AuthnContextDeclRef>urn:d</saml:AuthnContextDeclRef>");
  EXPECT_FALSE(elsewhere.contextClass);
  EXPECT_EQ(std::string("urn:d"), elsewhere.contextDeclaration);
}

TEST(ParseSaml2AssertionElement, ReadsStatementsInAnyOrder) {
  const Accepted read = AcceptedSaml2(
      AssertionStating(Piece::AttributeStatement() + Piece::AuthnStatement() +
                       "<saml:AttributeStatement><saml:Attribute Name='urn:three'/></saml:AttributeStatement>"));
  EXPECT_THAT(read.details.authnStatements, SizeIs(1));
  ASSERT_TRUE(read.common.AttributeStatement);
  const std::vector<AttributeType> &attributes = read.common.AttributeStatement->attributes;
  ASSERT_THAT(attributes, SizeIs(3));
  EXPECT_EQ("urn:one", attributes[0].Name);
  EXPECT_EQ("urn:name-format", attributes[0].NameFormat);
  EXPECT_EQ("One", attributes[0].FriendlyName);
  EXPECT_THAT(attributes[0].values, ElementsAre("first", "second"));
  EXPECT_EQ("urn:two", attributes[1].Name);
  EXPECT_EQ("urn:three", attributes[2].Name);
}

TEST(ParseSaml2AssertionElement, ReservesMemoryForTheAttributesOfAllStatementsOnce) {
  std::string statements;
  for (int i = 0; i < 5; ++i) {
    statements += Piece::AttributeStatement();
  }
  const ParsedDocument document(AssertionStating(statements));
  NodeFilterIterator iterator = document.Cursor();
  Saml2Assertion read;
  ParseSaml2AssertionElement(iterator, read);
  EXPECT_EQ(10u, read.common.AttributeStatement->attributes.size());
  EXPECT_EQ(10u, read.common.AttributeStatement->attributes.capacity());
}

TEST(ParseSaml2AssertionElement, HasNoStatementsIfTheAssertionHasNone) {
  const Accepted read = AcceptedSaml2(AssertionStating(""));
  EXPECT_FALSE(read.common.AttributeStatement);
  EXPECT_TRUE(read.details.authnStatements.empty());
}

TEST(ParseSaml2AssertionElement, IgnoresForeignXmlAttributesOfAttributes) {
  const Accepted read = AcceptedSaml2(
      AssertionWithAttributes("<saml:Attribute Name='a' xmlns:x='urn:x' x:OriginalIssuer='i' xml:lang='en'>"
                              "<saml:AttributeValue x:any='1' plain='2'>v</saml:AttributeValue></saml:Attribute>"));
  EXPECT_THAT(read.common.AttributeStatement->attributes[0].values, ElementsAre("v"));
}

TEST(ParseSaml2AssertionElement, AcceptsAttributeValuesOfAnyKindAndReadsThoseThatAreTexts) {
  const Accepted read = AcceptedSaml2(AssertionWithAttributes(
      "<saml:Attribute Name='a'><saml:AttributeValue/><saml:AttributeValue xsi:nil='true'/><saml:AttributeValue> "
      "</saml:AttributeValue><saml:AttributeValue><x>element</x></saml:AttributeValue><saml:AttributeValue>mixed<x/>"
      "</saml:AttributeValue><saml:AttributeValue>text<!-- comment --></saml:AttributeValue></saml:Attribute>"));
  EXPECT_THAT(read.common.AttributeStatement->attributes[0].values, ElementsAre("text"));
}

TEST(ParseSaml2AssertionElement, IgnoresCommentsAndWhiteSpaceBetweenElements) {
  AcceptedSaml2(ReplaceOnce(BearerAssertion(), "<saml:Subject>", "<!-- c -->\n <saml:Subject> <!-- d -->\t"));
}

} // namespace
