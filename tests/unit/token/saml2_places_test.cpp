// SPDX-License-Identifier: Apache-2.0
// The places that the rules of the profile SAML2 report, in assertions that the parser has read.

#include "support/recorded_deviations.h"
#include "token/saml2_checks.h"
#include "unit/token/saml2_assertion.h"

#include <tarvel/core/environment.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;

constexpr const char *NOW = "2026-01-01T01:00:00Z";

/// In all of these tests the time is `NOW`.
class Saml2PlacesTest : public ::testing::Test {
protected:
  template <typename Rule>
  static std::vector<Deviation> AllOf(const Rule &rule) {
    RecordedDeviations recorded;
    rule(recorded);
    return recorded.all;
  }

private:
  Tarvel::ScopedEnvironment m_clock{{[] { return DateTime(NOW).GetUtcTime(); }, {}}};
};

/// The name and the attribute, for example "saml:Conditions/NotBefore".
std::string PlaceOf(const Deviation &deviation) {
  return (deviation.element ? std::string(deviation.element->GetName()) : "nowhere") + "/" + deviation.attribute;
}

TEST_F(Saml2PlacesTest, ReportsTheIssueInstantIfTheConditionsHaveNoStart) {
  const std::string late =
      ReplaceOnce(AssertionUnder(""), "IssueInstant=\"2026-01-01T00:00:00Z\"", "IssueInstant=\"2026-01-01T07:00:00Z\"");
  const Accepted withoutStart(ReplaceOnce(late, " NotBefore=\"2026-01-01T00:00:00Z\"", ""));
  const auto all = AllOf([&](DeviationSink &sink) { CheckSaml2Validity(withoutStart, 600, sink); });
  ASSERT_EQ(2u, all.size());
  EXPECT_EQ("Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.", all[0].message);
  EXPECT_EQ("saml:Assertion/IssueInstant", PlaceOf(all[0]));
  EXPECT_EQ("Token start date is in the future: 2026-01-01T07:00:00.000Z", all[1].message);
  EXPECT_EQ("saml:Assertion/IssueInstant", PlaceOf(all[1]));
}

TEST_F(Saml2PlacesTest, ReportsTheDatesOfTheConditions) {
  const Accepted assertion(AssertionUnder(""));
  const auto all = AllOf([&](DeviationSink &sink) { CheckSaml2Validity(assertion, -100000, sink); });
  ASSERT_EQ(2u, all.size());
  EXPECT_EQ("saml:Conditions/NotBefore", PlaceOf(all[0]));
  EXPECT_EQ("saml:Conditions/NotOnOrAfter", PlaceOf(all[1]));
}

TEST_F(Saml2PlacesTest, ReportsTheStatementOfEachSessionThatHasEnded) {
  const auto session = [](const std::string &end) {
    return ReplaceOnce(Piece::AuthnStatement(), "AuthnInstant=", "SessionNotOnOrAfter=\"" + end + "\" AuthnInstant=");
  };
  const std::string ended = "2026-01-01T00:10:00Z";
  const std::string before = "2025-12-31T00:00:00Z";
  const Accepted assertion(AssertionStating(session("2026-01-01T02:00:00Z") + Piece::AttributeStatement() +
                                            Piece::AuthnStatement() + session(ended) + "<!-- comment -->" +
                                            session(before)));
  const auto all = AllOf([&](DeviationSink &sink) { CheckSessions(assertion, 600, DateTime(NOW), sink); });
  std::vector<std::string> found;
  for (const Deviation &deviation : all) {
    ASSERT_EQ("saml:AuthnStatement/SessionNotOnOrAfter", PlaceOf(deviation));
    found.push_back(deviation.message + " | " +
                    std::string(deviation.element->FindAttribute("", "SessionNotOnOrAfter")->GetValue()));
  }
  EXPECT_EQ((std::vector<std::string>{
                "The session has ended at: 2026-01-01T00:10:00.000Z | " + ended,
                "The session has ended at: 2025-12-31T00:00:00.000Z | " + before,
                "Unsatisfiable token validity conditions: the session ends before the token starts. | " + before}),
            found);
}

TEST_F(Saml2PlacesTest, ReportsTheDataOfAConfirmationOrTheConfirmationItself) {
  VerifyOptions options;
  options.acceptedRecipients = {"https://here/"};
  const Accepted assertion(
      AssertionConfirmedBy(Piece::Confirmation("bearer", "") + Piece::Confirmation("bearer", Piece::BEARER_DATA) +
                           Piece::Confirmation("sender-vouches", "") + Piece::Confirmation("holder-of-key", "")));
  const DateTime now(NOW);
  const ConfirmationChoice choice(assertion, options, now);
  EXPECT_EQ("saml:SubjectConfirmation/Recipient", PlaceOf(*choice.GetRefusal(0)));
  EXPECT_EQ("saml:SubjectConfirmationData/Recipient", PlaceOf(*choice.GetRefusal(1)));
  EXPECT_EQ("saml:SubjectConfirmation/Method", PlaceOf(*choice.GetRefusal(2)));
  EXPECT_EQ("saml:SubjectConfirmation/", PlaceOf(*choice.GetRefusal(3)));
  EXPECT_EQ(assertion.confirmations[3].element, choice.GetRefusal(3)->element);
}

TEST_F(Saml2PlacesTest, SetsTheElementsOfTheChosenConfirmation) {
  const std::string delegated = Piece::Confirmation("bearer", std::string(Piece::DELEGATE_NAME) + Piece::BEARER_DATA);
  const Accepted read(AssertionConfirmedBy(Piece::Confirmation("sender-vouches", "") + delegated));
  Saml2Assertion assertion = read;
  ASSERT_TRUE(ChooseConfirmation(assertion, {}, DateTime(NOW), ThrowingSink()));
  const SubjectConfirmationType &used = assertion.common.Subject.SubjectConfirmation;
  EXPECT_EQ(read.confirmations[1].element, used.element);
  EXPECT_EQ(read.confirmations[1].data, used.SubjectConfirmationData.element);
  EXPECT_EQ("saml:NameID", used.NameID->element->GetName());
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:cm:bearer", *used.writtenMethod);
}

TEST_F(Saml2PlacesTest, ReportsTheKeyOfABearerConfirmationWhichIsNotUsed) {
  const std::string withKey = Piece::Confirmation(
      "bearer", "<saml:SubjectConfirmationData><ds:KeyInfo>any</ds:KeyInfo></saml:SubjectConfirmationData>");
  Accepted alone(AssertionConfirmedBy(withKey));
  const auto all = AllOf([&](DeviationSink &sink) { ChooseConfirmation(alone, VerifyOptions(), DateTime(NOW), sink); });
  ASSERT_EQ(1u, all.size());
  EXPECT_EQ("The bearer confirmation has a key", all[0].message);
  EXPECT_EQ("ds:KeyInfo/", PlaceOf(all[0]));
  EXPECT_TRUE(alone.details.confirmations[0].publicKey.empty());

  Accepted beforeAnother(AssertionConfirmedBy(withKey + Piece::Confirmation("bearer", "")));
  EXPECT_TRUE(ChooseConfirmation(beforeAnother, VerifyOptions(), DateTime(NOW), ThrowingSink()));
  EXPECT_EQ(1u, beforeAnother.details.usedConfirmation);
}

} // namespace
