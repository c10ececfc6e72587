// SPDX-License-Identifier: Apache-2.0
// The checks of a report: only one fails, several fail at once, or some cannot be done.

#include "unit/token/explained_token.h"

#include "support/parsed_document.h"

#include <tarvel/xml/node.h>

namespace {

using namespace SsoClient;
using namespace Testing;
using Check = TokenReport::Check;
using Outcome = TokenReport::Outcome;

constexpr const char *ISSUE = "Ask the service's operator to issue ";

/// The bearer fixture with one change, signed again.
std::string Changed(const std::string &from, const std::string &to, const std::string &fixture = "bearer") {
  return SignAgain(ReplaceOnce(TokenFixture(fixture), from, to));
}

using ExplainChecks = ExplainedTokenTest;

TEST_F(ExplainChecks, AllPassForATokenThatIsAccepted) {
  for (const std::string fixture : {"full", "bearer", "delegated", "holder-of-key", "bearer-minimal"}) {
    const TokenReport report = Explain(TokenFixture(fixture));
    EXPECT_TRUE(report.accepted) << WriteTokenReport(report);
    EXPECT_EQ("", report.refusal);
    EXPECT_EQ("", NotPassed(report));
    EXPECT_EQ(nullptr, report.FirstFailed());
    EXPECT_EQ(Tarvel::System::DateTime("2026-01-02T03:04:05Z"), report.checkedAt);
  }
}

TEST_F(ExplainChecks, StateInOneSentenceWhatEachHasChecked) {
  const std::string thumbprint = TokenCertificates().front()->GetSha256Thumbprint();
  const TokenReport report = Explain(TokenFixture("bearer"));
  const std::vector<std::string> expected{
      "The text is a well-formed XML document of 4139 bytes.",
      "The assertion has the accepted form, and its signature covers it.",
      "The version is \"2.0\", the ID is \"_2454ad61-c2ac-c04f-0a20-fabf7f2bc96f\".",
      "Valid from 2020-01-01T00:00:00.000Z to 2120-01-01T00:00:00.000Z; now 2026-01-02T03:04:05.000Z "
      "(tolerance 600 s).",
      "The confirmation ends at 2120-01-01T00:00:00.000Z, the token at 2120-01-01T00:00:00.000Z.",
      "The confirmation has no delegate; there is no delegation restriction.",
      "The signature's algorithm is http://www.w3.org/2001/04/xmldsig-more#rsa-sha256, its canonicalization "
      "http://www.w3.org/2001/10/xml-exc-c14n#.",
      "1 of 1 trusted keys can be used with the signature.",
      "1 of 1 references resolve.",
      "Signed by CN=sts,O=Example (SHA-256 " + thumbprint + ").",
      "1 of 1 digests match.",
      "The subject is \"alice@corp.example\"; groups: 3; delegates: 0.",
      "The token is for https://files.corp.example/, https://mail.corp.example/; every audience is accepted.",
      "The confirmation is bearer; none is required."};
  ASSERT_EQ(expected.size(), report.checks.size());
  for (std::size_t index = 0; index < expected.size(); ++index) {
    EXPECT_EQ(expected[index], report.checks[index].summary);
    EXPECT_EQ(static_cast<Check>(index), report.checks[index].check);
  }
}

TEST_F(ExplainChecks, WellFormedFailsWithThePlaceInTheText) {
  const TokenReport report = Explain("<a>\n <b></a>");
  EXPECT_FALSE(report.accepted);
  EXPECT_EQ("the element 'b' of line 2 has another end tag at line 2, column 5", report.refusal);
  const TokenReport::Finding finding = OnlyFinding(report, Check::WELL_FORMED);
  EXPECT_EQ(report.refusal, finding.message);
  EXPECT_EQ(2u, finding.line);
  EXPECT_EQ(5u, finding.column);
  EXPECT_EQ("", finding.path);
  EXPECT_EQ("Use the whole token exactly as the service sent it, as XML in UTF-8.", finding.remedy);
  for (std::size_t index = 1; index < report.checks.size(); ++index) {
    EXPECT_EQ(Outcome::NOT_DONE, report.checks[index].outcome);
    EXPECT_EQ("The text could not be parsed.", report.checks[index].summary);
  }
  EXPECT_FALSE(report.claims.isAssertion);
}

TEST_F(ExplainChecks, OnlyTheFormFails) {
  const TokenReport report =
      Explain(Changed("<saml:AudienceRestriction>", "<saml:OneTimeUse/><saml:AudienceRestriction>"));
  EXPECT_EQ("form failed", NotPassed(report));
  EXPECT_EQ("Unknown or duplicate restriction node under Conditions: saml:OneTimeUse", report.refusal);
  const TokenReport::Finding finding = OnlyFinding(report, Check::FORM);
  EXPECT_EQ(report.refusal, finding.message);
  EXPECT_EQ("saml:OneTimeUse", finding.element);
  EXPECT_EQ("/saml:Assertion/saml:Conditions/saml:OneTimeUse", finding.path);
  EXPECT_EQ(
      "Verify the token with the profile SAML2, which reads it, or ask the service's operator to issue tokens of the "
      "accepted form.",
      finding.remedy);
  EXPECT_EQ("Deviations from the accepted form: 1. The profile SAML2 reads it.", report.Get(Check::FORM).summary);
}

TEST_F(ExplainChecks, OnlyTheIdentifiersFail) {
  const TokenReport version = Explain(Changed(" Version=\"2.0\"", " Version=\"2.1\""));
  EXPECT_EQ("identifiers failed", NotPassed(version));
  EXPECT_EQ("Invalid token version", version.refusal);
  const TokenReport::Finding finding = OnlyFinding(version, Check::IDENTIFIERS);
  EXPECT_EQ("Version", finding.attribute);
  EXPECT_EQ("/saml:Assertion", finding.path);
  EXPECT_EQ("2.0", finding.wanted);
  EXPECT_EQ("2.1", finding.found);
  EXPECT_EQ(std::string(ISSUE) + "SAML 2.0 tokens.", finding.remedy);

  const TokenReport id = Explain(SignAgain(ReplaceOnce(TokenFixture("bearer"), " ID=\"_", " ID=\"a")));
  EXPECT_EQ("identifiers failed", NotPassed(id));
  EXPECT_EQ("Invalid token ID", id.refusal);
  EXPECT_EQ("ID", OnlyFinding(id, Check::IDENTIFIERS).attribute);
  EXPECT_EQ(std::string(ISSUE) + "tokens whose ID begins with \"_\".", OnlyFinding(id, Check::IDENTIFIERS).remedy);
}

TEST_F(ExplainChecks, VersionAndIdAreReportedTogether) {
  const std::string token =
      ReplaceOnce(ReplaceOnce(TokenFixture("bearer"), " Version=\"2.0\"", " Version=\"2.1\""), " ID=\"_", " ID=\"a");
  const TokenReport report = Explain(SignAgain(token));
  ASSERT_EQ(2u, report.Get(Check::IDENTIFIERS).findings.size());
  EXPECT_EQ("Invalid token version", report.Get(Check::IDENTIFIERS).findings[0].message);
  EXPECT_EQ("Invalid token ID", report.Get(Check::IDENTIFIERS).findings[1].message);
  EXPECT_EQ("Invalid token version", report.refusal);
}

TEST_F(ExplainChecks, ReportByHowManySecondsAnExpiredTokenIsLate) {
  const TokenReport report = Explain(TokenFixture("expired"));
  EXPECT_EQ("validity failed", NotPassed(report));
  EXPECT_EQ("The token has expired at: 2021-01-01T00:00:00.000Z", report.refusal);
  const TokenReport::Finding finding = OnlyFinding(report, Check::VALIDITY);
  EXPECT_EQ("NotOnOrAfter", finding.attribute);
  EXPECT_EQ("/saml:Assertion/saml:Conditions", finding.path);
  EXPECT_EQ(22u, finding.line);
  EXPECT_EQ("after 2026-01-02T03:04:05.000Z, with a tolerance of 600 s", finding.wanted);
  EXPECT_EQ("2021-01-01T00:00:00.000Z", finding.found);
  EXPECT_EQ(157863845 - 600 + 1, finding.missedBySec);
  EXPECT_EQ("Get a new token. If this one is new, synchronise this machine's clock (it seems at least 157863246 s "
            "ahead), or the service's.",
            finding.remedy);
}

TEST_F(ExplainChecks, ReportByHowManySecondsAFutureTokenIsEarly) {
  const TokenReport report = Explain(SignAgain(ReplaceOnce(
      TokenFixture("bearer"), "NotBefore=\"2020-01-01T00:00:00.000Z\"", "NotBefore=\"2026-01-02T03:14:06.001Z\"")));
  EXPECT_EQ("validity failed", NotPassed(report));
  const TokenReport::Finding finding = OnlyFinding(report, Check::VALIDITY);
  EXPECT_EQ("Token start date is in the future: 2026-01-02T03:14:06.001Z", finding.message);
  EXPECT_EQ("NotBefore", finding.attribute);
  EXPECT_EQ("at or before 2026-01-02T03:04:05.000Z, with a tolerance of 600 s", finding.wanted);
  EXPECT_EQ(2, finding.missedBySec);
  EXPECT_EQ("Synchronise this machine's clock (it seems at least 2 s behind), or the service's.", finding.remedy);
}

TEST_F(ExplainChecks, AValidityCanFailInThreeWaysAtOnce) {
  std::string token = ReplaceOnce(TokenFixture("bearer"), "NotBefore=\"2020-01-01T00:00:00.000Z\"",
                                  "NotBefore=\"2100-01-01T00:00:00.000Z\"");
  token =
      ReplaceOnce(token, "NotOnOrAfter=\"2120-01-01T00:00:00.000Z\">", "NotOnOrAfter=\"2001-01-01T00:00:00.000Z\">");
  const TokenReport report = Explain(SignAgain(token));
  EXPECT_EQ("validity failed", NotPassed(report));
  const auto &findings = report.Get(Check::VALIDITY).findings;
  ASSERT_EQ(3u, findings.size());
  EXPECT_EQ("Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.", findings[0].message);
  EXPECT_EQ("before 2001-01-01T00:00:00.000Z", findings[0].wanted);
  EXPECT_EQ("2100-01-01T00:00:00.000Z", findings[0].found);
  EXPECT_EQ(0, findings[0].missedBySec);
  EXPECT_EQ(std::string(ISSUE) + "tokens whose NotBefore is before their NotOnOrAfter.", findings[0].remedy);
  EXPECT_EQ("Token start date is in the future: 2100-01-01T00:00:00.000Z", findings[1].message);
  EXPECT_EQ("The token has expired at: 2001-01-01T00:00:00.000Z", findings[2].message);
}

TEST_F(ExplainChecks, OnlyTheConfirmationFails) {
  const TokenReport report = Explain(Changed("Data NotOnOrAfter=\"2120-01-01", "Data NotOnOrAfter=\"2119-12-31"));
  EXPECT_EQ("confirmation failed", NotPassed(report));
  EXPECT_EQ("Invalid token subject validity", report.refusal);
  const TokenReport::Finding finding = OnlyFinding(report, Check::CONFIRMATION);
  EXPECT_EQ("/saml:Assertion/saml:Subject/saml:SubjectConfirmation/saml:SubjectConfirmationData", finding.path);
  EXPECT_EQ("NotOnOrAfter", finding.attribute);
  EXPECT_EQ("2120-01-01T00:00:00.000Z or later", finding.wanted);
  EXPECT_EQ("2119-12-31T00:00:00.000Z", finding.found);
  EXPECT_EQ("Ask the service's operator to let the confirmation of bearer tokens last as long as the token.",
            finding.remedy);
}

TEST_F(ExplainChecks, OnlyTheDelegationFails) {
  const TokenReport other =
      Explain(Changed(":holder-of-key\"><saml:NameID Format=\"http://schemas.xmlsoap.org/claims/UPN\">"
                      "backup@corp.example<",
                      ":holder-of-key\"><saml:NameID Format=\"http://schemas.xmlsoap.org/claims/UPN\">"
                      "gateway@corp.example<",
                      "delegated"));
  EXPECT_EQ("delegation failed", NotPassed(other));
  EXPECT_EQ("The SubjectConfirmation delegate id does not match the id of the last delegate", other.refusal);
  const TokenReport::Finding finding = OnlyFinding(other, Check::DELEGATION);
  EXPECT_EQ("/saml:Assertion/saml:Subject/saml:SubjectConfirmation/saml:NameID", finding.path);
  EXPECT_EQ("backup@corp.example", finding.wanted);
  EXPECT_EQ("gateway@corp.example", finding.found);
  EXPECT_EQ(std::string(ISSUE) + "delegated tokens whose confirmation names the last delegate.", finding.remedy);
}

TEST_F(ExplainChecks, NamesReportEachNameThatCannotBeRead) {
  std::string token = ReplaceOnce(TokenFixture("full"), ">alice@corp.example<", ">alice<");
  token = ReplaceOnce(token, "corp.example\\Users", "Users");
  token = ReplaceOnce(token, ">gateway@corp.example<", ">gateway<");
  const TokenReport report = Explain(SignAgain(token));
  EXPECT_EQ("names failed", NotPassed(report));
  EXPECT_EQ("Failed to parse the UPN NameID: `alice'; name or domain part is missing.", report.refusal);
  const auto &findings = report.Get(Check::NAMES).findings;
  ASSERT_EQ(3u, findings.size());
  EXPECT_EQ("/saml:Assertion/saml:Subject/saml:NameID", findings[0].path);
  EXPECT_EQ("name@domain", findings[0].wanted);
  EXPECT_EQ("alice", findings[0].found);
  EXPECT_EQ("Failed to parse Group Identity value: `Users'; domain or group missing", findings[1].message);
  EXPECT_EQ("/saml:Assertion/saml:AttributeStatement/saml:Attribute", findings[1].path);
  EXPECT_EQ("Failed to parse the UPN NameID: `gateway'; name or domain part is missing.", findings[2].message);
  EXPECT_EQ("/saml:Assertion/saml:Conditions/saml:Condition/del:Delegate/saml:NameID", findings[2].path);
  EXPECT_EQ(2u, report.claims.groups.size());
  EXPECT_EQ(1u, report.claims.delegationChain.size());
  EXPECT_FALSE(report.claims.subject);
  EXPECT_EQ("alice", report.claims.nameId.value());
}

TEST_F(ExplainChecks, OnlyTheAudienceFails) {
  VerifyOptions options;
  options.acceptedAudiences = {"urn:b", "urn:a"};
  const TokenReport report = Explain(TokenFixture("bearer"), options);
  EXPECT_EQ("audience failed", NotPassed(report));
  EXPECT_EQ("The token is restricted to other audiences: https://files.corp.example/, https://mail.corp.example/",
            report.refusal);
  const TokenReport::Finding finding = OnlyFinding(report, Check::AUDIENCE);
  EXPECT_EQ("/saml:Assertion/saml:Conditions", finding.path);
  EXPECT_EQ("urn:a, urn:b", finding.wanted);
  EXPECT_EQ("https://files.corp.example/, https://mail.corp.example/", finding.found);
  EXPECT_EQ(
      "Ask the service for a token for one of these audiences: urn:a, urn:b; or accept the token's audience, if it "
      "means this program.",
      finding.remedy);
  EXPECT_EQ("The token is for https://files.corp.example/, https://mail.corp.example/; accepted: urn:a, urn:b.",
            report.Get(Check::AUDIENCE).summary);
}

TEST_F(ExplainChecks, OnlyTheRequiredConfirmationFails) {
  VerifyOptions options;
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  const TokenReport report = Explain(TokenFixture("bearer"), options);
  EXPECT_EQ("required-confirmation failed", NotPassed(report));
  EXPECT_EQ("The token's confirmation is bearer, but holder-of-key is required", report.refusal);
  const TokenReport::Finding finding = OnlyFinding(report, Check::REQUIRED_CONFIRMATION);
  EXPECT_EQ("/saml:Assertion/saml:Subject/saml:SubjectConfirmation", finding.path);
  EXPECT_EQ("Method", finding.attribute);
  EXPECT_EQ("Ask the service for a holder-of-key token.", finding.remedy);
}

TEST_F(ExplainChecks, SeveralFailuresAreAllReportedAndTheFirstIsTheRefusal) {
  std::string token = ReplaceOnce(TokenFixture("expired"), ">alice@corp.example<", ">alice<");
  token = ReplaceOnce(token, " Version=\"2.0\"", " Version=\"1.1\"");
  VerifyOptions options;
  options.acceptedAudiences = {"urn:other"};
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  const TokenReport report = TokenVerifier(TokenCertificates({"other"}), options).Explain(token);
  EXPECT_FALSE(report.accepted);
  EXPECT_EQ("identifiers failed, validity failed, signature failed, digests failed, names failed, audience failed, "
            "required-confirmation failed",
            NotPassed(report));
  EXPECT_EQ("Invalid token version", report.refusal);
  EXPECT_EQ(&report.Get(Check::IDENTIFIERS), report.FirstFailed());
}

TEST_F(ExplainChecks, ATokenInAnotherDocumentIsReportedButNotAccepted) {
  const std::string token = TokenFixture("bearer");
  const TokenReport report = Explain("<e><f/>" + token.substr(token.find("<saml:Assertion")) + "</e>");
  EXPECT_FALSE(report.accepted);
  EXPECT_EQ("form failed", NotPassed(report));
  EXPECT_EQ("Expected element 'Assertion' not found.", report.refusal);
  EXPECT_EQ("Give only the Assertion element, with the namespace declarations that it needs.",
            OnlyFinding(report, Check::FORM).remedy);
  EXPECT_EQ("The document element is not an assertion, so the first assertion in it was examined; deviations from the "
            "accepted form: 1.",
            report.Get(Check::FORM).summary);
  EXPECT_TRUE(report.claims.isAssertion);
  EXPECT_EQ("alice", report.claims.subject.value().name);
}

TEST_F(ExplainChecks, NothingIsDoneWithoutAnAssertion) {
  const TokenReport report = Explain("<html/>");
  EXPECT_EQ("Give a SAML 2.0 assertion: there is none in this document.",
            report.Get(Check::FORM).findings.at(0).remedy);
  EXPECT_EQ("There is no assertion.", report.Get(Check::FORM).summary);
  for (std::size_t index = 2; index < report.checks.size(); ++index) {
    EXPECT_EQ(Outcome::NOT_DONE, report.checks[index].outcome);
    EXPECT_EQ("There is no assertion.", report.checks[index].summary);
  }
  EXPECT_FALSE(report.claims.isAssertion);
  EXPECT_FALSE(report.claims.id);
}

TEST_F(ExplainChecks, AnAssertionOfAnEarlierVersionIsReportedButNotAccepted) {
  for (const std::string begin : {"", "<html/>"}) {
    const std::string token = "<Assertion xmlns=\"urn:oasis:names:tc:SAML:1.0:assertion\" ID=\"_1\"/>";
    const TokenReport report = Explain("<e>" + begin + token + "</e>");
    EXPECT_FALSE(report.accepted);
    EXPECT_EQ("Expected element 'Assertion' not found.", report.refusal);
    EXPECT_EQ("Give a SAML 2.0 assertion: there is none in this document.",
              report.Get(Check::FORM).findings.at(0).remedy);
    EXPECT_EQ("There is no SAML 2.0 assertion, so the first element of that name was examined; deviations from the "
              "accepted form: " +
                  std::to_string(report.Get(Check::FORM).findings.size()) + ".",
              report.Get(Check::FORM).summary);
    EXPECT_LT(5u, report.Get(Check::FORM).findings.size());
    EXPECT_TRUE(report.claims.isAssertion);
    EXPECT_EQ("_1", report.claims.id.value());
  }
}

TEST_F(ExplainChecks, AnElementIsReportedLikeItsText) {
  const ParsedDocument document(TokenFixture("expired"));
  const TokenReport report = TokenVerifier(TokenCertificates()).Explain(document.Root());
  EXPECT_EQ("validity failed", NotPassed(report));
  EXPECT_EQ("The element is parsed already and has a canonical form.", report.Get(Check::WELL_FORMED).summary);
}

TEST_F(ExplainChecks, AnElementWithoutACanonicalFormIsNotWellFormed) {
  const ParsedDocument document(ReplaceOnce(TokenFixture("bearer"), "<saml:Audience>https://mail.corp.example/",
                                            "<saml:Audience p:a=\"\">https://mail.corp.example/"));
  const TokenVerifier verifier(TokenCertificates());
  const TokenReport report = verifier.Explain(document.Root());
  EXPECT_EQ("well-formed failed, form failed, digests failed", NotPassed(report));
  const TokenReport::Finding finding = OnlyFinding(report, Check::WELL_FORMED);
  EXPECT_EQ(report.refusal, finding.message);
  EXPECT_EQ("/saml:Assertion", finding.path);
  try {
    verifier.Verify(document.Root());
    ADD_FAILURE() << "accepted";
  } catch (const Tarvel::Exception &error) {
    EXPECT_EQ(report.refusal, error.what());
  }
}

} // namespace
