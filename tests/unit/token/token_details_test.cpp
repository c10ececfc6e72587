// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/token_details.h>

#include "support/parsed_document.h"
#include "support/report_texts.h"
#include "support/throws_message.h"
#include "unit/token/rich_assertion.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/core/environment.h>
#include <tarvel/core/exception.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;

constexpr const char *UPN = "http://schemas.xmlsoap.org/claims/UPN";

/// In all of these tests the time is 2026-01-02T03:04:05Z.
class TokenDetailsTest : public ::testing::Test {
protected:
  static std::shared_ptr<const SamlToken> Verified(const std::string &xml, const VerifyOptions &options = {}) {
    return TokenVerifier(TokenCertificates(), options).Verify(xml);
  }
  static TokenDetails RichDetails() { return GetTokenDetails(*Verified(RichToken(), Saml2Options())); }

private:
  Tarvel::ScopedEnvironment m_clock{{[] { return DateTime("2026-01-02T03:04:05Z").GetUtcTime(); }, {}}};
};

/// A token of another implementation.
class ForeignToken final : public SamlToken {
public:
  explicit ForeignToken(const SamlToken &token) : m_token(token) {}

  const std::string &GetId() const override { return m_token.GetId(); }
  const DateTime &GetStartDate() const override { return m_token.GetStartDate(); }
  const DateTime &GetEndDate() const override { return m_token.GetEndDate(); }
  const PrincipalId &GetSubject() const override { return m_token.GetSubject(); }
  bool IsRenewable() const override { return false; }
  bool IsDelegable() const override { return false; }
  bool IsSolution() const override { return false; }
  ConfirmationType GetConfirmationMethod() const override { return BEARER; }
  void GetFullName(std::pair<std::string, std::string> &) const override {}
  void GetGroups(std::vector<PrincipalId> &) const override {}
  void GetDelegationChain(std::vector<Delegate> &) const override {}
  void GetAudience(std::set<std::string> &) const override {}
  void GetAdvice(std::vector<Advice> &) const override {}
  const Tarvel::Crypto::Certificate *GetConfirmationCertificate() const override { return nullptr; }
  const std::string &ToXml() const override { return m_token.ToXml(); }

private:
  const SamlToken &m_token;
};

TEST_F(TokenDetailsTest, HaveTheNamesWithTheirQualifiers) {
  const TokenDetails details = RichDetails();
  EXPECT_EQ((NameId{"https://idp.example/", boost::none, std::string("urn:realm"), boost::none, boost::none}),
            details.issuer);
  EXPECT_EQ((NameId{"AbC & d", std::string("urn:oasis:names:tc:SAML:2.0:nameid-format:persistent"),
                    std::string("https://idp.example/"), std::string("https://sp.example/"), std::string("a-17")}),
            details.subject);
  EXPECT_EQ(DateTime("2026-01-01T00:00:00Z"), details.issueInstant);
}

TEST_F(TokenDetailsTest, HaveAllConfirmationsAndWhichIsUsed) {
  const TokenDetails details = RichDetails();
  ASSERT_EQ(4u, details.confirmations.size());
  EXPECT_EQ(3u, details.usedConfirmation);
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:cm:sender-vouches", details.confirmations[0].method);
  EXPECT_EQ("gateway", details.confirmations[0].nameId.value().value);
  EXPECT_EQ(DateTime("2026-01-01T12:00:00Z"), details.confirmations[1].notOnOrAfter.value());

  const ConfirmationDetails &holder = details.confirmations[2];
  const auto certificate = TokenCertificates({"holder"}).front();
  EXPECT_EQ(certificate->GetDer(), holder.certificate->GetDer());
  EXPECT_FALSE(holder.publicKey.empty());
  EXPECT_FALSE(holder.notOnOrAfter || holder.recipient);

  const ConfirmationDetails &used = details.confirmations[3];
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:cm:bearer", used.method);
  EXPECT_FALSE(used.nameId);
  EXPECT_EQ(DateTime("2026-01-02T00:00:00Z"), used.notBefore.value());
  EXPECT_EQ(DateTime("2026-01-03T00:00:00Z"), used.notOnOrAfter.value());
  EXPECT_EQ("https://sp.example/acs", used.recipient.value());
  EXPECT_EQ("_request", used.inResponseTo.value());
  EXPECT_EQ("192.0.2.7", used.address.value());
  EXPECT_FALSE(used.certificate);
  EXPECT_TRUE(used.publicKey.empty());
}

TEST_F(TokenDetailsTest, StateWhichConfirmationTheOptionsChose) {
  VerifyOptions options = Saml2Options();
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  EXPECT_EQ(2u, GetTokenDetails(*Verified(RichToken(), options)).usedConfirmation);
}

TEST_F(TokenDetailsTest, HaveTheConditions) {
  const TokenDetails details = RichDetails();
  EXPECT_EQ((std::vector<std::set<std::string>>{{"urn:a", "urn:b"}, {"urn:b"}}), details.audienceRestrictions);
  EXPECT_TRUE(details.isOneTimeUse);
  EXPECT_EQ(2u, details.proxyRestriction.value().count.value());
  EXPECT_EQ(std::set<std::string>{"urn:proxy"}, details.proxyRestriction->audiences);
}

TEST_F(TokenDetailsTest, HaveTheStatementsOfAuthentication) {
  const TokenDetails details = RichDetails();
  ASSERT_EQ(1u, details.authnStatements.size());
  const AuthnStatementDetails &statement = details.authnStatements.front();
  EXPECT_EQ(DateTime("2026-01-02T01:00:00Z"), statement.authnInstant);
  EXPECT_EQ("s-1", statement.sessionIndex.value());
  EXPECT_EQ(DateTime("2026-01-02T20:00:00Z"), statement.sessionNotOnOrAfter.value());
  EXPECT_EQ("192.0.2.8", statement.localityAddress.value());
  EXPECT_EQ("pc.example", statement.localityDnsName.value());
  EXPECT_EQ("urn:class", statement.contextClass.value());
  EXPECT_EQ("urn:declaration", statement.contextDeclaration.value());
  EXPECT_EQ((std::vector<std::string>{"urn:first", "urn:second"}), statement.authenticatingAuthorities);
}

TEST_F(TokenDetailsTest, HaveTheAttributesOfAllStatements) {
  const std::vector<SamlAttribute> attributes = RichDetails().attributes;
  ASSERT_EQ(3u, attributes.size());
  EXPECT_EQ("mail", attributes[0].name);
  EXPECT_EQ("urn:format", attributes[0].nameFormat.value());
  EXPECT_EQ("Mail", attributes[0].friendlyName.value());
  EXPECT_EQ("none", attributes[1].name);
  EXPECT_FALSE(attributes[1].nameFormat || attributes[1].friendlyName);
  EXPECT_TRUE(attributes[1].values.empty());
  EXPECT_EQ("tree", attributes[2].name);
}

TEST_F(TokenDetailsTest, HaveTheTextOfEachValue) {
  const std::vector<AttributeValue> values = RichDetails().attributes.at(0).values;
  ASSERT_EQ(4u, values.size());
  EXPECT_EQ("a\xC3\xA9<b> ", values[0].text); // a reference, CDATA and white space at the end
  EXPECT_EQ("", values[1].text);
  EXPECT_EQ("  ", values[2].text);
  EXPECT_EQ("", values[3].text);
  for (std::size_t index = 0; index < values.size(); ++index) {
    EXPECT_EQ(index == 3, values[index].isNil);
    EXPECT_FALSE(values[index].isXml);
  }
}

TEST_F(TokenDetailsTest, HaveAValueWithElementsInExclusiveCanonicalForm) {
  const AttributeValue value = RichDetails().attributes.at(2).values.at(0);
  EXPECT_TRUE(value.isXml);
  EXPECT_EQ("<saml:AttributeValue xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\"><q:v xmlns:q=\"urn:q\" a=\"1\" "
            "b=\"2\">x<w xmlns=\"urn:w\"></w></q:v></saml:AttributeValue>",
            value.text);
}

TEST_F(TokenDetailsTest, ReadEachSpellingOfNil) {
  for (const auto &[written, isNil] :
       {std::pair<const char *, bool>("true", true), {"1", true}, {"false", false}, {"0", false}, {"yes", false}}) {
    const auto token =
        Verified(RichToken("xsi:nil=\"true\"", std::string("xsi:nil=\"") + written + "\""), Saml2Options());
    EXPECT_EQ(isNil, GetAttributes(*token).at(0).values.at(3).isNil) << written;
  }
}

TEST_F(TokenDetailsTest, AreTheSameInBothProfilesForAStrictToken) {
  for (const char *const fixture : {"full", "bearer", "delegated", "holder-of-key", "bearer-minimal"}) {
    const TokenDetails strict = GetTokenDetails(*Verified(TokenFixture(fixture)));
    const TokenDetails saml2 = GetTokenDetails(*Verified(TokenFixture(fixture), Saml2Options()));
    EXPECT_EQ(DescribeDetails(strict), DescribeDetails(saml2)) << fixture;
    EXPECT_EQ(0u, strict.usedConfirmation);
  }
}

TEST_F(TokenDetailsTest, OfAStrictTokenHaveAllThatItStates) {
  const TokenDetails details = GetTokenDetails(*Verified(TokenFixture("full")));
  EXPECT_EQ("sts@corp.example", details.issuer.value);
  EXPECT_EQ("alice@corp.example", details.subject.value);
  EXPECT_EQ("backup@corp.example", details.confirmations.at(0).nameId.value().value);
  EXPECT_TRUE(details.confirmations.at(0).certificate);
  EXPECT_EQ(3u, details.proxyRestriction.value().count.value());
  ASSERT_EQ(5u, details.attributes.size());
  EXPECT_EQ("urn:corp.example:attribute:unknown", details.attributes.back().name);
  EXPECT_EQ("ignored", details.attributes.back().values.at(0).text);
  EXPECT_EQ("corp.example\\Ops\\Night Shift", details.attributes.front().values.at(2).text);
}

TEST_F(TokenDetailsTest, AreTheSameForATokenInALargerDocument) {
  const std::string xml = RichToken();
  const ParsedDocument document("<envelope>" + xml + "</envelope>");
  const auto token =
      TokenVerifier(TokenCertificates(), Saml2Options()).Verify(*document.Root().FindChildElement("Assertion"));
  EXPECT_EQ(DescribeDetails(RichDetails()), DescribeDetails(GetTokenDetails(*token)));
}

TEST_F(TokenDetailsTest, OfATokenInADocumentDoNotDependOnTheXmlAttributesAroundIt) {
  const ParsedDocument document("<envelope xml:lang=\"en\" xml:space=\"preserve\">" + RichToken() + "</envelope>");
  const auto token =
      TokenVerifier(TokenCertificates(), Saml2Options()).Verify(*document.Root().FindChildElement("Assertion"));
  EXPECT_EQ(DescribeDetails(RichDetails()), DescribeDetails(GetTokenDetails(*token)));
}

TEST_F(TokenDetailsTest, OfATokenInADocumentHaveTheNameThatWasVerified) {
  const ParsedDocument document("<envelope>" + RichToken(">AbC &amp; d<", "> <!-- c -->AbC &amp; d<") + "</envelope>");
  const auto token =
      TokenVerifier(TokenCertificates(), Saml2Options()).Verify(*document.Root().FindChildElement("Assertion"));
  EXPECT_EQ("AbC & d", GetNameId(*token).value);
  EXPECT_EQ(GetNameId(*token), GetTokenDetails(*token).subject);
}

TEST_F(TokenDetailsTest, OfATokenInADocumentAreRefusedIfItsCanonicalFormIsTooLong) {
  const ParsedDocument document("<envelope>" + RichToken(">x<w", ">" + std::string(4 * 1024 * 1024, '>') + "<w") +
                                "</envelope>");
  const auto token =
      TokenVerifier(TokenCertificates(), Saml2Options()).Verify(*document.Root().FindChildElement("Assertion"));
  EXPECT_THROW(GetTokenDetails(*token), Tarvel::Xml::XMLParseException); // the place depends on the certificate's lines
  EXPECT_EQ("AbC & d", GetNameId(*token).value);
}

TEST_F(TokenDetailsTest, GetNameIdIsThatOfTheDetails) {
  const auto strict = Verified(TokenFixture("bearer"));
  EXPECT_EQ((NameId{"alice@corp.example", std::string(UPN), boost::none, boost::none, boost::none}),
            GetNameId(*strict));
  EXPECT_EQ(GetTokenDetails(*strict).subject, GetNameId(*strict));
  const auto saml2 = Verified(RichToken(), Saml2Options());
  EXPECT_EQ(GetTokenDetails(*saml2).subject, GetNameId(*saml2));
  EXPECT_EQ("AbC & d", GetNameId(*saml2).value);
}

TEST_F(TokenDetailsTest, GetAttributesAreThoseOfTheDetails) {
  const auto token = Verified(RichToken(), Saml2Options());
  TokenDetails details = GetTokenDetails(*token);
  const std::string expected = DescribeDetails(details);
  details.attributes = GetAttributes(*token);
  EXPECT_EQ(expected, DescribeDetails(details));
}

TEST_F(TokenDetailsTest, AreRefusedForATokenOfAnotherImplementation) {
  const auto token = Verified(TokenFixture("bearer"));
  const ForeignToken foreign(*token);
  const std::string message = "Invalid argument : the token was not made by this library";
  EXPECT_THROWS_MESSAGE(GetTokenDetails(foreign), Tarvel::InvalidArgumentException, message);
  EXPECT_THROWS_MESSAGE(GetNameId(foreign), Tarvel::InvalidArgumentException, message);
  EXPECT_THROWS_MESSAGE(GetAttributes(foreign), Tarvel::InvalidArgumentException, message);
}

TEST_F(TokenDetailsTest, AreLimitedIfEachValueRepeatsALongNamespace) {
  const auto most = Verified(SignAgain(WithLongNamespace(8000)), Saml2Options());
  EXPECT_EQ(8000u, GetAttributes(*most).at(0).values.size());
  const auto tooMany = Verified(SignAgain(WithLongNamespace(8300)), Saml2Options());
  EXPECT_THROWS_MESSAGE(GetAttributes(*tooMany), ParseException,
                        "The attribute values that contain elements are too long");
  EXPECT_THROWS_MESSAGE(GetTokenDetails(*tooMany), ParseException,
                        "The attribute values that contain elements are too long");
  EXPECT_EQ("AbC & d", GetNameId(*tooMany).value);
}

TEST_F(TokenDetailsTest, CanBeReadByManyThreadsAtOnce) {
  const auto token = Verified(RichToken(), Saml2Options());
  const std::string expected = DescribeDetails(GetTokenDetails(*token));
  std::atomic<int> equal = 0;
  std::vector<std::thread> threads;
  for (int index = 0; index < 4; ++index) {
    threads.emplace_back([&] {
      for (int turn = 0; turn < 20; ++turn) {
        equal += DescribeDetails(GetTokenDetails(*token)) == expected && GetNameId(*token).value == "AbC & d" ? 1 : 0;
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(4 * 20, equal);
}

} // namespace
