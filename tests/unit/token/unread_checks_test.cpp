// SPDX-License-Identifier: Apache-2.0
// Checks that cannot be done, because what they need cannot be read.

#include "unit/token/explained_token.h"

#include "support/data_file.h"

#include <tarvel/core/environment.h>

namespace {

using namespace SsoClient;
using namespace Testing;
using Check = TokenReport::Check;
using Outcome = TokenReport::Outcome;

/// A fixture with one change, signed again.
std::string Changed(const std::string &from, const std::string &to, const std::string &fixture = "bearer") {
  return SignAgain(ReplaceOnce(TokenFixture(fixture), from, to));
}

/// The text without the part from `begin` to `end`, which are removed, too.
std::string Without(std::string text, const std::string &begin, const std::string &end) {
  const std::size_t position = text.find(begin);
  return text.erase(position, text.find(end, position + begin.size()) + end.size() - position);
}

using UnreadChecks = ExplainedTokenTest;

TEST_F(UnreadChecks, ChecksThatNeedTheConditionsAreNotDoneWithoutThem) {
  const TokenReport report =
      Explain(SignAgain(Without(TokenFixture("bearer"), "<saml:Conditions", "</saml:Conditions>")));
  EXPECT_EQ("form failed, validity not done, confirmation not done, delegation not done, audience not done",
            NotPassed(report));
  EXPECT_EQ("The NotBefore of the Conditions cannot be read.", report.Get(Check::VALIDITY).summary);
  EXPECT_EQ("The NotOnOrAfter of the Conditions cannot be read.", report.Get(Check::CONFIRMATION).summary);
  EXPECT_EQ("There are no Conditions.", report.Get(Check::DELEGATION).summary);
  EXPECT_EQ("There are no Conditions.", report.Get(Check::AUDIENCE).summary);
  EXPECT_FALSE(report.claims.startDate);
  EXPECT_FALSE(report.claims.renewable);
}

TEST_F(UnreadChecks, ADateThatCannotBeReadIsNotCompared) {
  const TokenReport end = Explain(Changed("NotOnOrAfter=\"2120-01-01T00:00:00.000Z\">", "NotOnOrAfter=\"never\">"));
  EXPECT_EQ("form failed, validity not done, confirmation not done", NotPassed(end));
  EXPECT_EQ("The NotOnOrAfter of the Conditions cannot be read.", end.Get(Check::VALIDITY).summary);
  const TokenReport data =
      Explain(Changed("Data NotOnOrAfter=\"2120-01-01T00:00:00.000Z\"", "Data NotOnOrAfter=\"never\""));
  EXPECT_EQ("form failed, confirmation not done", NotPassed(data));
  EXPECT_EQ("The NotOnOrAfter of the SubjectConfirmationData cannot be read.", data.Get(Check::CONFIRMATION).summary);
}

TEST_F(UnreadChecks, TheDateOfTheEpochIsReadLikeAnyOther) {
  std::string token = ReplaceOnce(TokenFixture("bearer"), "NotBefore=\"2020-01-01T00:00:00.000Z\"",
                                  "NotBefore=\"1970-01-01T00:00:00Z\" Extra=\"\"");
  const TokenReport report = Explain(SignAgain(token));
  EXPECT_EQ("form failed", NotPassed(report));
  EXPECT_EQ(Tarvel::System::DateTime(), report.claims.startDate.value());
}

TEST_F(UnreadChecks, AnUnknownConfirmationIsNotCompared) {
  VerifyOptions options;
  options.requiredConfirmation = SamlToken::BEARER;
  const TokenReport report = Explain(Changed(":cm:bearer\"", ":cm:sender-vouches\""), options);
  EXPECT_EQ("form failed, confirmation not done, required-confirmation not done", NotPassed(report));
  const std::string missing = "The Method of the SubjectConfirmation is missing or not known.";
  EXPECT_EQ(missing, report.Get(Check::CONFIRMATION).summary);
  EXPECT_EQ(missing, report.Get(Check::REQUIRED_CONFIRMATION).summary);
  EXPECT_FALSE(report.claims.confirmation);
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:cm:sender-vouches", report.claims.confirmationMethod.value());
}

TEST_F(UnreadChecks, AMissingVersionIsReportedOnce) {
  const TokenReport version = Explain(Changed(" Version=\"2.0\"", ""));
  EXPECT_EQ("form failed, identifiers not done", NotPassed(version));
  EXPECT_EQ("The Version is missing.", version.Get(Check::IDENTIFIERS).summary);
}

TEST_F(UnreadChecks, ANameThatCannotBeReadIsReportedOnce) {
  const std::string named =
      "<saml:NameID Format=\"http://schemas.xmlsoap.org/claims/UPN\">alice@corp.example</saml:NameID>";
  const TokenReport report = Explain(Changed(named, "<saml:NameID/>"));
  EXPECT_EQ("form failed, names not done", NotPassed(report));
  EXPECT_EQ("The NameID of the Subject cannot be read.", report.Get(Check::NAMES).summary);
  EXPECT_EQ(3u, report.claims.groups.size());
}

TEST_F(UnreadChecks, ADelegateThatCannotBeReadIsReportedOnce) {
  const std::string delegate = "backup@corp.example</saml:NameID></del:Delegate>";
  const TokenReport report = Explain(Changed(delegate, "<x/></saml:NameID></del:Delegate>", "delegated"));
  EXPECT_EQ("form failed, delegation not done", NotPassed(report));
  EXPECT_EQ("The last delegate of the delegation restriction cannot be read.", report.Get(Check::DELEGATION).summary);
  EXPECT_EQ(1u, report.Get(Check::FORM).findings.size());
}

TEST_F(UnreadChecks, AMissingIdIsNotReportedAgainAsAWrongId) {
  const TokenReport report = Explain(Without(TokenFixture("bearer"), " ID=\"", "\""));
  EXPECT_EQ(Outcome::NOT_DONE, report.Get(Check::IDENTIFIERS).outcome);
  EXPECT_EQ("The ID is missing.", report.Get(Check::IDENTIFIERS).summary);
  EXPECT_FALSE(report.claims.id);
}

TEST_F(UnreadChecks, ADelegateOfTheConfirmationThatCannotBeReadIsNotCompared) {
  const std::string delegate = "backup@corp.example</saml:NameID><saml:SubjectConfirmationData";
  const TokenReport report = Explain(Changed(delegate, "<x/></saml:NameID><saml:SubjectConfirmationData", "delegated"));
  EXPECT_EQ("form failed, delegation not done", NotPassed(report));
  EXPECT_EQ("The delegate of the SubjectConfirmation cannot be read.", report.Get(Check::DELEGATION).summary);
}

TEST_F(UnreadChecks, AMissingSubjectConfirmationIsNotCompared) {
  const TokenReport report = Explain(
      SignAgain(Without(TokenFixture("delegated"), "<saml:SubjectConfirmation ", "</saml:SubjectConfirmation>")));
  EXPECT_EQ("form failed, confirmation not done, delegation not done, required-confirmation not done",
            NotPassed(report));
  EXPECT_EQ("There is no SubjectConfirmation.", report.Get(Check::DELEGATION).summary);
}

TEST_F(UnreadChecks, ReferencesAreNotCheckedIfThereAreNone) {
  const TokenReport report = Explain(ReadDataFile("attacks/references-none.xml"));
  EXPECT_EQ(Outcome::NOT_DONE, report.Get(Check::REFERENCES).outcome) << WriteTokenReport(report);
}

TEST(ReportClock, HasTheTimeThatTheValidityWasComparedWith) {
  std::int64_t now = Tarvel::System::DateTime("2026-01-02T03:04:05Z").GetUtcTime();
  const Tarvel::ScopedEnvironment clock({[&now] { return now += 1'000'000; }, {}});
  const TokenReport report = TokenVerifier(TokenCertificates()).Explain(TokenFixture("expired"));
  EXPECT_EQ("after " + report.checkedAt.ToString() + ", with a tolerance of 600 s",
            OnlyFinding(report, Check::VALIDITY).wanted);
}

} // namespace
