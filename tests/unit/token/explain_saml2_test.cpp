// SPDX-License-Identifier: Apache-2.0
// Reports in the profile SAML2, and what a report states about the other profile.

#include "unit/token/explained_token.h"
#include "unit/token/rich_assertion.h"

#include "support/report_texts.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/token_details.h>

namespace {

using namespace SsoClient;
using namespace Testing;
using Check = TokenReport::Check;
using Tarvel::System::DateTime;

/// In all of these tests the time is 2026-01-02T03:04:05Z.
class ExplainSaml2 : public ExplainedTokenTest {
protected:
  /// The report in the profile SAML2. It must agree with the verification.
  static TokenReport ExplainIn(const std::string &xml, const VerifyOptions &options = Saml2Options()) {
    TokenReport report = Explain(xml, options);
    std::string refusal;
    std::string details;
    try {
      details = DescribeDetails(GetTokenDetails(*TokenVerifier(TokenCertificates(), options).Verify(xml)));
    } catch (const InvalidTokenException &error) {
      refusal = error.what();
    }
    EXPECT_EQ(refusal, report.refusal);
    EXPECT_EQ(refusal.empty(), report.accepted);
    if (report.accepted) {
      EXPECT_EQ(details, DescribeDetails(report.claims.details.value()));
    }
    return report;
  }

  static std::string Summary(const TokenReport &report, Check check) { return report.Get(check).summary; }
};

TEST_F(ExplainSaml2, AcceptsWhatTheProfileAccepts) {
  const TokenReport report = ExplainIn(RichToken());
  EXPECT_EQ("", NotPassed(report)) << WriteTokenReport(report);
  EXPECT_EQ("The assertion has the accepted form, and its signature covers it. The profile STRICT does not read it: "
            "Unexpected attributes on element 'saml:Assertion'.",
            Summary(report, Check::FORM));
  EXPECT_EQ(
      "Valid from 2026-01-01T00:00:00.000Z to 2026-02-01T00:00:00.000Z; now 2026-01-02T03:04:05.000Z (tolerance 600 "
      "s). The session ends at 2026-01-02T20:00:00.000Z.",
      Summary(report, Check::VALIDITY));
  EXPECT_EQ("The confirmation has no delegate; there is no delegation restriction.",
            Summary(report, Check::DELEGATION));
  EXPECT_EQ(
      "The subject is \"AbC & d\"; the principal is \"AbC & d\" in "
      "\"nameid:persistent;name-qualifier=https://idp.example/;sp-name-qualifier=https://sp.example/\"; groups: 0; "
      "delegates: 0.",
      Summary(report, Check::NAMES));
  EXPECT_EQ("The token is for (urn:a, urn:b) and (urn:b); every audience is accepted.",
            Summary(report, Check::AUDIENCE));
  EXPECT_EQ("The confirmation is bearer; none is required.", Summary(report, Check::REQUIRED_CONFIRMATION));
}

TEST_F(ExplainSaml2, DoesNotRepeatTheSignatureOfATokenInAValue) {
  const std::string value = "<s:SignatureValue xmlns:s=\"urn:s\">c2VjcmV0</s:SignatureValue>";
  for (const std::string &written : {value, "<![CDATA[" + value + "]]>"}) {
    const TokenReport report =
        Explain(RichToken("<saml:AttributeValue>  <", "<saml:AttributeValue>" + written + "<"), Saml2Options());
    EXPECT_TRUE(report.accepted) << report.refusal;
    EXPECT_EQ("", report.claims.details.value().attributes.at(0).values.at(2).text) << written;
  }
}

TEST_F(ExplainSaml2, StatesWhichConfirmationIsUsedAndWhyTheOthersAreNot) {
  EXPECT_EQ(
      "Confirmation 4 (bearer) of 4 is used; NotBefore 2026-01-02T00:00:00.000Z; NotOnOrAfter "
      "2026-01-03T00:00:00.000Z; Recipient \"https://sp.example/acs\", not checked; InResponseTo \"_request\", not "
      "checked; Address \"192.0.2.7\", not checked. Not 1 (urn:oasis:names:tc:SAML:2.0:cm:sender-vouches): Unknown "
      "subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'. Not 2 (bearer): The subject "
      "confirmation has expired at: 2026-01-01T12:00:00.000Z. Not 3 (holder-of-key): another is preferred.",
      Summary(ExplainIn(RichToken()), Check::CONFIRMATION));
}

TEST_F(ExplainSaml2, DoesNotReportAsNotCheckedWhatTheOptionsRequire) {
  VerifyOptions options = Saml2Options();
  options.acceptedRecipients = {"https://sp.example/acs"};
  options.expectedInResponseTo = "_request";
  options.senderAddress = "192.0.2.7";
  const std::string summary = Summary(ExplainIn(RichToken(), options), Check::CONFIRMATION);
  EXPECT_EQ(0u,
            summary.find("Confirmation 4 (bearer) of 4 is used; NotBefore 2026-01-02T00:00:00.000Z; NotOnOrAfter "
                         "2026-01-03T00:00:00.000Z; Recipient \"https://sp.example/acs\"; InResponseTo \"_request\"; "
                         "Address \"192.0.2.7\". Not 1 "))
      << summary;
}

TEST_F(ExplainSaml2, StatesWhatIsCheckedIfOnlyOneOptionIsSet) {
  VerifyOptions options = Saml2Options();
  options.expectedInResponseTo = "_request";
  const std::string request = Summary(ExplainIn(RichToken(), options), Check::CONFIRMATION);
  EXPECT_NE(std::string::npos, request.find("; InResponseTo \"_request\"; Address \"192.0.2.7\", not checked."))
      << request;
  options = Saml2Options();
  options.senderAddress = "192.0.2.7";
  const std::string sender = Summary(ExplainIn(RichToken(), options), Check::CONFIRMATION);
  EXPECT_NE(std::string::npos, sender.find("; InResponseTo \"_request\", not checked; Address \"192.0.2.7\"."))
      << sender;
}

TEST_F(ExplainSaml2, StatesEachReasonOfTheFirstConfirmationIfNoneCanBeUsed) {
  VerifyOptions options = Saml2Options();
  options.requiredConfirmation = SamlToken::BEARER;
  options.acceptedRecipients = {"urn:us"};
  options.expectedInResponseTo = "_other";
  options.senderAddress = "192.0.2.9";
  const TokenReport report = ExplainIn(RichToken(Rich::EXPIRED_BEARER, ""), options);
  EXPECT_EQ("confirmation failed, delegation not done, required-confirmation not done", NotPassed(report));
  const TokenReport::CheckResult &result = report.Get(Check::CONFIRMATION);
  ASSERT_EQ(3u, result.findings.size());
  EXPECT_EQ("The subject confirmation is for another recipient: https://sp.example/acs", result.findings[0].message);
  EXPECT_EQ(
      "Ask the service for a token whose recipient is one of urn:us; or accept the token's recipient, if it is an "
      "address of this program.",
      result.findings[0].remedy);
  EXPECT_EQ("Use the token that answers the request _other. One that answers another may be replayed.",
            result.findings[1].remedy);
  EXPECT_EQ("Accept the token only from the sender to whom it was issued.", result.findings[2].remedy);
  EXPECT_EQ(
      0u, result.summary.find("No confirmation can be used. Not 1 (urn:oasis:names:tc:SAML:2.0:cm:sender-vouches): "));
  EXPECT_EQ("No confirmation can be used.", Summary(report, Check::DELEGATION));
  EXPECT_EQ("No confirmation can be used.", Summary(report, Check::REQUIRED_CONFIRMATION));
  EXPECT_FALSE(report.claims.confirmation);
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:cm:sender-vouches", report.claims.confirmationMethod.value());
  EXPECT_EQ(3u, report.claims.details.value().usedConfirmation);
}

TEST_F(ExplainSaml2, ReportsABearerConfirmationWithAKey) {
  VerifyOptions options = Saml2Options();
  options.requiredConfirmation = SamlToken::BEARER;
  const TokenReport report = ExplainIn(
      RichToken(Rich::EXPIRED_BEARER + Piece::Confirmation("holder-of-key", Piece::HolderOfKeyData()) + Rich::BEARER,
                Piece::Confirmation("bearer", Piece::HolderOfKeyData())),
      options);
  const TokenReport::Finding finding = OnlyFinding(report, Check::CONFIRMATION);
  EXPECT_EQ("The bearer confirmation has a key", finding.message);
  EXPECT_EQ("Ask the service's operator to issue bearer confirmations without a key, or holder-of-key confirmations.",
            finding.remedy);
}

TEST_F(ExplainSaml2, ReportsASessionThatHasEnded) {
  const TokenReport report = ExplainIn(
      RichToken("SessionNotOnOrAfter=\"2026-01-02T20:00:00Z\"", "SessionNotOnOrAfter=\"2026-01-02T02:50:00Z\""));
  EXPECT_EQ("confirmation failed", NotPassed(report));
  const TokenReport::Finding finding = OnlyFinding(report, Check::CONFIRMATION);
  EXPECT_EQ("The session has ended at: 2026-01-02T02:50:00.000Z", finding.message);
  EXPECT_EQ("SessionNotOnOrAfter", finding.attribute);
  EXPECT_EQ(246, finding.missedBySec);
  EXPECT_EQ("Authenticate again, and get a new token.", finding.remedy);
}

TEST_F(ExplainSaml2, ReportsAFormThatNeitherProfileReads) {
  const TokenReport report = ExplainIn(RichToken("<saml:OneTimeUse/>", "<saml:Unknown/>"));
  EXPECT_EQ("form failed", NotPassed(report));
  EXPECT_EQ(
      "Deviations from the accepted form: 1. The profile STRICT does not read it either: Unexpected attributes on "
      "element 'saml:Assertion'.",
      Summary(report, Check::FORM));
  EXPECT_FALSE(report.claims.details);
  EXPECT_EQ("AbC & d", report.claims.nameId.value());
}

TEST_F(ExplainSaml2, SkipsTheConfirmationIfADateCannotBeRead) {
  const TokenReport report = ExplainIn(RichToken("NotOnOrAfter=\"2026-01-03T00:00:00Z\"", "NotOnOrAfter=\"later\""));
  EXPECT_EQ("form failed, confirmation not done, delegation not done, required-confirmation not done",
            NotPassed(report));
  EXPECT_EQ("A date of a SubjectConfirmationData cannot be read.", Summary(report, Check::CONFIRMATION));
}

TEST_F(ExplainSaml2, SkipsTheConfirmationIfThereIsNone) {
  const TokenReport report = ExplainIn(RichToken(RichConfirmations(), ""));
  EXPECT_EQ("form failed, confirmation not done, delegation not done, required-confirmation not done",
            NotPassed(report));
  EXPECT_EQ("There is no SubjectConfirmation.", Summary(report, Check::CONFIRMATION));
}

TEST_F(ExplainSaml2, SkipsWhatNeedsADateThatCannotBeRead) {
  const TokenReport end = ExplainIn(RichToken("NotOnOrAfter=\"2026-02-01T00:00:00Z\"", "NotOnOrAfter=\"later\""));
  EXPECT_EQ("The NotOnOrAfter of the Conditions cannot be read.", Summary(end, Check::VALIDITY));
  EXPECT_EQ("The NotOnOrAfter of the Conditions cannot be read.", Summary(end, Check::CONFIRMATION));
  const TokenReport start = ExplainIn(RichToken("NotBefore=\"2026-01-01T00:00:00Z\"", "NotBefore=\"soon\""));
  EXPECT_EQ("Neither the NotBefore of the Conditions nor the IssueInstant can be read.",
            Summary(start, Check::VALIDITY));
}

TEST_F(ExplainSaml2, ClaimsThePeriodInWhichTheTokenCanBeUsed) {
  const UnverifiedClaims claims = ExplainIn(RichToken()).claims;
  EXPECT_EQ(DateTime("2026-01-02T00:00:00Z"), claims.startDate.value());
  EXPECT_EQ(DateTime("2026-01-02T20:00:00Z"), claims.endDate.value());
  EXPECT_EQ(std::set<std::string>{"urn:b"}, claims.audience);
  EXPECT_EQ("AbC & d", claims.subject.value().name);
  EXPECT_EQ(SamlToken::BEARER, claims.confirmation.value());
}

TEST_F(ExplainSaml2, AcceptsStrictTokensAndStatesThatStrictReadsThem) {
  for (const std::string fixture : {"full", "bearer", "delegated", "holder-of-key", "bearer-minimal"}) {
    const TokenReport report = ExplainIn(TokenFixture(fixture));
    EXPECT_TRUE(report.accepted) << WriteTokenReport(report);
    EXPECT_EQ("The assertion has the accepted form, and its signature covers it. The profile STRICT reads it, too.",
              Summary(report, Check::FORM));
  }
}

TEST_F(ExplainSaml2, ClaimsTheSameForAStrictTokenInBothProfiles) {
  for (const std::string fixture : {"full", "delegated", "holder-of-key", "bearer-minimal"}) {
    const UnverifiedClaims strict = Explain(TokenFixture(fixture)).claims;
    EXPECT_EQ(DescribeClaims(strict), DescribeClaims(ExplainIn(TokenFixture(fixture)).claims)) << fixture;
    EXPECT_TRUE(strict.details);
  }
}

TEST_F(ExplainSaml2, StatesInAStrictReportThatTheOtherProfileReadsTheForm) {
  const TokenReport report = Explain(RichToken());
  EXPECT_FALSE(report.accepted);
  EXPECT_EQ(report.refusal, report.Get(Check::FORM).findings.front().message);
  const std::string summary = Summary(report, Check::FORM);
  const std::string end = " The profile SAML2 reads it.";
  EXPECT_EQ(summary.size() - end.size(), summary.find(end)) << summary;
  EXPECT_EQ(
      "Verify the token with the profile SAML2, which reads it, or ask the service's operator to issue tokens of the "
      "accepted form.",
      report.Get(Check::FORM).findings.front().remedy);
  EXPECT_EQ(3u, report.claims.details.value().usedConfirmation);
}

TEST_F(ExplainSaml2, ClaimsInAStrictReportWhichConfirmationIsUsedOrThatNoneIs) {
  const UnverifiedClaims claims =
      Explain(RichToken(Rich::BEARER + std::string("</saml:Subject>"), "</saml:Subject>")).claims;
  EXPECT_EQ(2u, claims.details.value().usedConfirmation); // the holder-of-key confirmation
  const TokenReport report = Explain(TokenFixture("expired"));
  EXPECT_EQ(1u, report.claims.details.value().confirmations.size());
  EXPECT_EQ(1u, report.claims.details->usedConfirmation);
}

TEST_F(ExplainSaml2, DoesNotMentionTheOtherProfileForADocumentAroundTheAssertion) {
  for (const VerifyOptions &options : {VerifyOptions(), Saml2Options()}) {
    const TokenReport report = Explain("<envelope>" + RichToken() + "</envelope>", options);
    EXPECT_EQ(std::string::npos, Summary(report, Check::FORM).find("The profile")) << Summary(report, Check::FORM);
    EXPECT_EQ("Give only the Assertion element, with the namespace declarations that it needs.",
              report.Get(Check::FORM).findings.front().remedy);
  }
}

/// The bearer fixture with one change, signed again.
std::string Changed(const std::string &from, const std::string &to) {
  return SignAgain(ReplaceOnce(TokenFixture("bearer"), from, to));
}

TEST_F(ExplainSaml2, StatesInAStrictReportThatTheOtherProfileAcceptsTheNames) {
  const TokenReport report = Explain(Changed("Format=\"http://schemas.xmlsoap.org/claims/UPN\">alice",
                                             "Format=\"urn:oasis:names:tc:SAML:2.0:nameid-format:persistent\">alice"));
  EXPECT_EQ("names failed", NotPassed(report));
  EXPECT_EQ("The subject is \"alice@corp.example\"; groups: 3; delegates: 0. The profile SAML2 accepts it.",
            Summary(report, Check::NAMES));
}

TEST_F(ExplainSaml2, StatesInAStrictReportThatTheOtherProfileDoesNotAcceptTheNamesEither) {
  const std::string solution =
      "<saml:Attribute Name=\"" SSOCLIENT_SOLUTION_AUTHORITY "/schemas/attr-names/2011/07/isSolution\"/>";
  const TokenReport report = Explain(Changed("<saml:AttributeStatement>", "<saml:AttributeStatement>" + solution));
  EXPECT_EQ("names failed", NotPassed(report));
  EXPECT_EQ(
      "The subject is \"alice@corp.example\"; groups: 3; delegates: 0. The profile SAML2 does not accept it either: "
      "No value found for attribute isSolution.",
      Summary(report, Check::NAMES));
}

TEST_F(ExplainSaml2, StatesInAStrictReportWhetherTheOtherProfileAcceptsAShorterConfirmation) {
  const std::string token = TokenFixture("bearer");
  const std::string data = "SubjectConfirmationData NotOnOrAfter=\"";
  const std::size_t end = token.find(data) + data.size();
  const auto withEnd = [&](const std::string &date) {
    return SignAgain(token.substr(0, end) + date + token.substr(token.find('"', end)));
  };
  EXPECT_EQ(
      "The confirmation ends at 2026-01-03T00:00:00.000Z, the token at 2120-01-01T00:00:00.000Z. The profile SAML2 "
      "accepts it.",
      Summary(Explain(withEnd("2026-01-03T00:00:00Z")), Check::CONFIRMATION));
  EXPECT_EQ(
      "The confirmation ends at 2026-01-01T00:00:00.000Z, the token at 2120-01-01T00:00:00.000Z. The profile SAML2 "
      "does not accept it either: The subject confirmation has expired at: 2026-01-01T00:00:00.000Z.",
      Summary(Explain(withEnd("2026-01-01T00:00:00Z")), Check::CONFIRMATION));
}

TEST_F(ExplainSaml2, StatesInAStrictReportWhetherTheOtherProfileAcceptsTheDelegate) {
  const std::string data = "<saml:SubjectConfirmationData ";
  const auto withDelegate = [&](const std::string &name) {
    return Changed(data,
                   "<saml:NameID Format=\"http://schemas.xmlsoap.org/claims/UPN\">" + name + "</saml:NameID>" + data);
  };
  EXPECT_EQ(
      "The delegate of the confirmation is \"alice@corp.example\"; there is no delegation restriction. The profile "
      "SAML2 accepts it.",
      Summary(Explain(withDelegate("alice@corp.example")), Check::DELEGATION));
  EXPECT_EQ(
      "The delegate of the confirmation is \"bob@corp.example\"; there is no delegation restriction. The profile SAML2 "
      "does not accept it either: Token SubjectConfirmation contains delegate id, but no delegation restriction is "
      "present.",
      Summary(Explain(withDelegate("bob@corp.example")), Check::DELEGATION));
}

TEST_F(ExplainSaml2, LeavesOutAttributesThatAreTooLongToClaim) {
  EXPECT_EQ(8000u, Explain(WithLongNamespace(8000), Saml2Options()).claims.details.value().attributes[0].values.size());
  const UnverifiedClaims claims = Explain(WithLongNamespace(8300), Saml2Options()).claims;
  EXPECT_TRUE(claims.details.value().attributes.empty());
  EXPECT_EQ(4u, claims.details->confirmations.size());
}

TEST_F(ExplainSaml2, LeavesOutAttributesWithoutACanonicalForm) {
  const UnverifiedClaims claims =
      Explain(ReplaceOnce(RichToken(), "xmlns=\"urn:w\"", "xmlns=\"w\""), Saml2Options()).claims;
  EXPECT_TRUE(claims.details.value().attributes.empty());
  EXPECT_EQ(4u, claims.details->confirmations.size());
}

TEST_F(ExplainSaml2, CutsASummaryOfManyConfirmations) {
  std::string confirmations;
  for (int index = 0; index < 900; ++index) {
    confirmations += Rich::EXPIRED_BEARER;
  }
  const TokenReport report = ExplainIn(RichToken(Rich::EXPIRED_BEARER, confirmations));
  EXPECT_TRUE(report.accepted);
  EXPECT_GT(1100u, Summary(report, Check::CONFIRMATION).size());
}

} // namespace
