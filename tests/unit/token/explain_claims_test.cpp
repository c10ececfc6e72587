// SPDX-License-Identifier: Apache-2.0
// The claims in a report: what the token states, without verification.

#include "unit/token/explained_token.h"

#include "support/facts_of.h"

#include <tarvel/crypto/certificate.h>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;

using ExplainClaims = ExplainedTokenTest;

TEST_F(ExplainClaims, AreThoseOfTheToken) {
  const UnverifiedClaims claims = Explain(TokenFixture("full")).claims;
  EXPECT_TRUE(claims.isAssertion);
  EXPECT_EQ("_a18b869b-2e81-c0c5-2955-2a3c4fa5c92e", claims.id.value());
  EXPECT_EQ("sts@corp.example", claims.issuer.value());
  EXPECT_EQ(DateTime("2020-01-01T00:00:00Z"), claims.issueInstant.value());
  EXPECT_EQ("alice@corp.example", claims.nameId.value());
  EXPECT_EQ("http://schemas.xmlsoap.org/claims/UPN", claims.nameIdFormat.value());
  EXPECT_EQ("{Name: alice; Domain:corp.example}", claims.subject.value().ToString());
  EXPECT_EQ(SamlToken::HOLDER_OF_KEY, claims.confirmation.value());
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:cm:holder-of-key", claims.confirmationMethod.value());
  EXPECT_EQ(DateTime("2020-01-01T00:00:00Z"), claims.startDate.value());
  EXPECT_EQ(DateTime("2120-01-01T00:00:00Z"), claims.endDate.value());
  EXPECT_TRUE(claims.renewable.value());
  EXPECT_TRUE(claims.delegable.value());
  EXPECT_TRUE(claims.solution.value());
  EXPECT_EQ((std::pair<std::string, std::string>("Alice", "Liddell")), claims.fullName.value());
  ASSERT_EQ(3u, claims.groups.size());
  EXPECT_EQ("{Name: Administrators; Domain:corp.example}", claims.groups.front().ToString());
  ASSERT_EQ(2u, claims.delegationChain.size());
  EXPECT_EQ("{Name: backup; Domain:corp.example}", claims.delegationChain.back().subject.ToString());
  EXPECT_EQ((std::set<std::string>{"https://files.corp.example/", "https://mail.corp.example/"}), claims.audience);
  EXPECT_FALSE(claims.advice.empty());
  EXPECT_EQ("CN=holder,O=Example", claims.certificateSubject);
  EXPECT_EQ(TokenCertificates({"holder"}).front()->GetSha256Thumbprint(), claims.certificateThumbprint);
}

TEST_F(ExplainClaims, OfABearerTokenHaveNoCertificate) {
  const UnverifiedClaims claims = Explain(TokenFixture("bearer-minimal")).claims;
  EXPECT_EQ(SamlToken::BEARER, claims.confirmation.value());
  EXPECT_EQ("", claims.certificateSubject);
  EXPECT_EQ("", claims.certificateThumbprint);
  EXPECT_FALSE(claims.renewable.value());
  EXPECT_FALSE(claims.solution.value());
  EXPECT_TRUE(claims.groups.empty());
}

TEST_F(ExplainClaims, AreAlsoReportedWhenTheTokenIsRefused) {
  const std::string token = ReplaceOnce(TokenFixture("bearer"), ">alice@corp.example<", ">mallory@corp.example<");
  const TokenReport report = Explain(token);
  EXPECT_FALSE(report.accepted);
  EXPECT_EQ("mallory", report.claims.subject.value().name);
}

TEST_F(ExplainClaims, AreThoseThatCanBeReadInATokenOfAnotherForm) {
  std::string token =
      ReplaceOnce(TokenFixture("bearer"), "saml:NameID Format=\"http://schemas.xmlsoap.org/claims/UPN\"",
                  "saml:NameID Format=\"urn:oasis:names:tc:SAML:2.0:nameid-format:persistent\"");
  token = ReplaceOnce(token, " IssueInstant=\"2020-01-01T00:00:00.000Z\"", " IssueInstant=\"today\"");
  token = ReplaceOnce(token, "<saml:AttributeStatement>", "<x/><saml:AttributeStatement>");
  const UnverifiedClaims claims = Explain(token).claims;
  EXPECT_FALSE(claims.issueInstant);
  EXPECT_FALSE(claims.subject);
  EXPECT_EQ("alice@corp.example", claims.nameId.value());
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:nameid-format:persistent", claims.nameIdFormat.value());
  EXPECT_EQ(3u, claims.groups.size());
  EXPECT_EQ(2u, claims.audience.size());
}

TEST_F(ExplainClaims, AreEmptyForAnEmptyAssertion) {
  const UnverifiedClaims claims = Explain("<a:Assertion xmlns:a=\"urn:oasis:names:tc:SAML:2.0:assertion\"/>").claims;
  EXPECT_TRUE(claims.isAssertion);
  EXPECT_FALSE(claims.id || claims.issuer || claims.issueInstant || claims.nameId || claims.nameIdFormat);
  EXPECT_FALSE(claims.subject || claims.confirmation || claims.confirmationMethod || claims.startDate ||
               claims.endDate);
  EXPECT_FALSE(claims.renewable || claims.delegable || claims.solution || claims.fullName);
}

TEST_F(ExplainClaims, KeepTheTextsAsTheSenderWroteThem) {
  const std::string hostile = "al\u202eice\u0085";
  const TokenReport report = Explain(ReplaceOnce(TokenFixture("bearer"), ">alice@corp.example<", ">" + hostile + "<"));
  EXPECT_EQ(hostile, report.claims.nameId.value());
  EXPECT_EQ("al\\u202Eice\\u0085", report.Get(TokenReport::Check::NAMES).findings.at(0).found);
}

TEST_F(ExplainClaims, ThousandsOfDeviationsDoNotHideOtherChecks) {
  std::string elements;
  for (int index = 0; index < 5000; ++index) {
    elements += "<x/>";
  }
  const std::string token = ReplaceOnce(TokenFixture("expired"), "</saml:Conditions>", elements + "</saml:Conditions>");
  const TokenReport report = Explain(token);
  const TokenReport::CheckResult &form = report.Get(TokenReport::Check::FORM);
  EXPECT_EQ(988u, form.findings.size());
  EXPECT_EQ(5000u - 988u, form.unlistedFindings);
  EXPECT_EQ("Deviations from the accepted form: 5000. The profile SAML2 does not read it either: Unexpected content of "
            "element 'saml:Conditions': element x.",
            form.summary);
  EXPECT_EQ("/saml:Assertion/saml:Conditions/x[988]", form.findings.back().path);
  EXPECT_EQ("form failed, validity failed, digests failed", NotPassed(report));
  EXPECT_EQ(1u, report.Get(TokenReport::Check::VALIDITY).findings.size());
  EXPECT_NE(std::string::npos, WriteTokenReport(report).find("    and 4012 more\n"));
}

} // namespace
