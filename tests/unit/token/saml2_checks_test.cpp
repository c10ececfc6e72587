// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_checks.h"

#include "support/recorded_deviations.h"
#include "support/throws_message.h"
#include "token/token_checks.h"
#include "unit/token/saml2_records.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/environment.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <limits>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;

constexpr std::int64_t SMALLEST = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t LARGEST = std::numeric_limits<std::int64_t>::max();

constexpr const char *UNSATISFIABLE_SESSION =
    "Unsatisfiable token validity conditions: the session ends before the token starts.";

/// In all of these tests the time is 2026-01-02T03:04:05.006Z.
class Saml2ChecksTest : public ::testing::Test {
protected:
  static std::vector<std::string> SessionMessages(const Saml2Assertion &assertion, std::int64_t tolerance = 600) {
    return MessagesOf([&](DeviationSink &sink) { CheckSessions(assertion, tolerance, AtSecond(0), sink); });
  }

  static std::vector<std::string> DelegationMessages(const Saml2Assertion &assertion) {
    return MessagesOf([&](DeviationSink &sink) { CheckSaml2Delegation(assertion, sink); });
  }

private:
  Tarvel::ScopedEnvironment m_clock{{[] { return AtSecond(0).GetUtcTime(); }, {}}};
};

using CheckSaml2ValidityTest = Saml2ChecksTest;
using CheckSessionsTest = Saml2ChecksTest;
using CheckSaml2DelegationTest = Saml2ChecksTest;
using CheckSaml2PropertiesTest = Saml2ChecksTest;

std::vector<std::string> One(const std::string &message) {
  return {message};
}

TEST_F(CheckSaml2ValidityTest, IsTheSameAsInTheProfileStrict) {
  for (const auto &[from, to] : std::vector<std::pair<int, int>>{
           {600, 3600}, {601, 3600}, {-3600, -599}, {-3600, -600}, {10, 10}, {11, 10}, {601, -600}}) {
    const Saml2Assertion assertion = ValidBetween(AtSecond(from), AtSecond(to));
    EXPECT_EQ(
        MessagesOf([&](DeviationSink &sink) { CheckValidity(assertion.common.Conditions, 600, sink); }),
        MessagesOf([&](DeviationSink &sink) { EXPECT_EQ(AtSecond(0), CheckSaml2Validity(assertion, 600, sink)); }));
  }
}

TEST_F(CheckSaml2ValidityTest, AppliesTheToleranceToTheSecond) {
  const auto messages = [](std::int64_t from, std::int64_t to) {
    return MessagesOf(
        [&](DeviationSink &sink) { CheckSaml2Validity(ValidBetween(AtSecond(from), AtSecond(to)), 600, sink); });
  };
  EXPECT_EQ(std::vector<std::string>(), messages(600, 3600));
  EXPECT_EQ(One("Token start date is in the future: 2026-01-02T03:14:06.006Z"), messages(601, 3600));
  EXPECT_EQ(std::vector<std::string>(), messages(-3600, -599));
  EXPECT_EQ(One("The token has expired at: 2026-01-02T02:54:05.006Z"), messages(-3600, -600));
  EXPECT_EQ(One("Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter."), messages(5, 5));
}

TEST_F(CheckSessionsTest, AppliesTheToleranceToTheEndOfEachSession) {
  EXPECT_EQ(std::vector<std::string>(), SessionMessages(WithSessions({})));
  EXPECT_EQ(std::vector<std::string>(), SessionMessages(WithSessions({boost::none, AtSecond(-599)})));
  EXPECT_EQ(One("The session has ended at: 2026-01-02T02:54:05.006Z"),
            SessionMessages(WithSessions({AtSecond(9000), boost::none, AtSecond(-600)})));
  EXPECT_EQ((std::vector<std::string>{"The session has ended at: 2026-01-02T02:54:04.006Z",
                                      "The session has ended at: 2026-01-02T02:54:05.006Z"}),
            SessionMessages(WithSessions({AtSecond(-601), AtSecond(-600)})));
  EXPECT_EQ(std::vector<std::string>(), SessionMessages(WithSessions({AtSecond(61)}), -60));
  EXPECT_EQ(One("The session has ended at: 2026-01-02T03:05:05.006Z"),
            SessionMessages(WithSessions({AtSecond(60)}), -60));
  EXPECT_EQ(std::vector<std::string>(), SessionMessages(WithSessions({AtSecond(-3599)}), LARGEST));
  EXPECT_EQ(One("The session has ended at: 9999-12-31T23:59:59.000Z"),
            SessionMessages(WithSessions({DateTime("9999-12-31T23:59:59Z")}), SMALLEST));
}

TEST_F(CheckSessionsTest, RefusesASessionThatEndsBeforeTheConditionsStart) {
  Saml2Assertion assertion = WithSessions({AtSecond(-300)});
  assertion.common.Conditions.NotBefore = AtSecond(-300);
  EXPECT_EQ(One(UNSATISFIABLE_SESSION), SessionMessages(assertion));
  assertion.common.Conditions.NotBefore = AtSecond(-301);
  EXPECT_EQ(std::vector<std::string>(), SessionMessages(assertion));
}

TEST_F(CheckSessionsTest, RefusesASessionThatEndsBeforeTheChosenConfirmationStarts) {
  Saml2Assertion assertion = WithSessions({AtSecond(300)});
  Put(assertion, {Bearer().From(AtSecond(200)), Bearer().From(AtSecond(300))});
  EXPECT_TRUE(ChooseConfirmation(assertion, {}, AtSecond(0), ThrowingSink()));
  EXPECT_EQ(std::vector<std::string>(), SessionMessages(assertion));
  Put(assertion, {Bearer().From(AtSecond(300)), Bearer().From(AtSecond(200))});
  EXPECT_TRUE(ChooseConfirmation(assertion, {}, AtSecond(0), ThrowingSink()));
  EXPECT_EQ(One(UNSATISFIABLE_SESSION), SessionMessages(assertion));
}

TEST_F(CheckSessionsTest, MakesNoTextsForAFullSink) {
  RecordedDeviations full(0);
  CheckSessions(WithSessions({AtSecond(-4000), AtSecond(-5000)}), 600, AtSecond(0), full);
  EXPECT_EQ(4u, full.unlisted);
}

TEST(GetTokenPeriod, IsTheIntersectionOfConditionsChosenConfirmationAndSessions) {
  for (const int confirmationStart : {-20, 20}) {
    for (const int confirmationEnd : {880, 920}) {
      for (const int session : {870, 930}) {
        Saml2Assertion assertion = WithSessions({AtSecond(960), boost::none, AtSecond(session), AtSecond(950)});
        assertion.common.Conditions.NotBefore = AtSecond(0);
        assertion.common.Conditions.NotOnOrAfter = AtSecond(900);
        Put(assertion, {SenderVouches().From(AtSecond(100)).Until(AtSecond(200)),
                        Bearer().From(AtSecond(confirmationStart)).Until(AtSecond(confirmationEnd))});
        EXPECT_EQ(AtSecond(0), GetTokenPeriod(assertion).start);
        EXPECT_EQ(AtSecond(std::min(session, 900)), GetTokenPeriod(assertion).end);
        EXPECT_TRUE(ChooseConfirmation(assertion, {}, AtSecond(0), ThrowingSink()));
        EXPECT_EQ(AtSecond(std::max(confirmationStart, 0)), GetTokenPeriod(assertion).start);
        EXPECT_EQ(AtSecond(std::min({confirmationEnd, session, 900})), GetTokenPeriod(assertion).end);
      }
    }
  }
}

TEST_F(CheckSaml2DelegationTest, AcceptsAConfirmationWithoutADelegate) {
  EXPECT_EQ(std::vector<std::string>(), DelegationMessages(Delegated({}, {})));
  EXPECT_EQ(std::vector<std::string>(), DelegationMessages(Delegated({}, {DELEGATE})));
}

TEST_F(CheckSaml2DelegationTest, AcceptsOnlyTheSubjectIfThereIsNoRestriction) {
  const std::string refusal =
      "Token SubjectConfirmation contains delegate id, but no delegation restriction is present";
  EXPECT_EQ(std::vector<std::string>(), DelegationMessages(Delegated(SUBJECT, {})));
  for (const NameId &other : IdentifiersThatDifferFrom(SUBJECT)) {
    EXPECT_EQ(One(refusal), DelegationMessages(Delegated(other, {}))) << other.value;
  }
}

TEST_F(CheckSaml2DelegationTest, AcceptsOnlyTheLastDelegateIfThereIsARestriction) {
  const std::string refusal = "The SubjectConfirmation delegate id does not match the id of the last delegate";
  EXPECT_EQ(std::vector<std::string>(), DelegationMessages(Delegated(DELEGATE, {DELEGATE})));
  EXPECT_EQ(std::vector<std::string>(), DelegationMessages(Delegated(DELEGATE, {SUBJECT, DELEGATE})));
  EXPECT_EQ(One(refusal), DelegationMessages(Delegated(DELEGATE, {DELEGATE, SUBJECT})));
  EXPECT_EQ(One(refusal), DelegationMessages(Delegated(SUBJECT, {DELEGATE})));
  for (const NameId &other : IdentifiersThatDifferFrom(DELEGATE)) {
    EXPECT_EQ(One(refusal), DelegationMessages(Delegated(other, {DELEGATE}))) << other.value;
  }
}

TEST_F(CheckSaml2DelegationTest, TreatsNoFormatAsUnspecifiedAndIgnoresTheProvidedId) {
  NameId withoutFormat = DELEGATE;
  withoutFormat.format = boost::none;
  NameId unspecified = DELEGATE;
  unspecified.format = std::string("urn:oasis:names:tc:SAML:1.1:nameid-format:unspecified");
  NameId provided = DELEGATE;
  provided.spProvidedId = std::string("b4ckup");
  EXPECT_EQ(std::vector<std::string>(), DelegationMessages(Delegated(withoutFormat, {unspecified})));
  EXPECT_EQ(std::vector<std::string>(), DelegationMessages(Delegated(unspecified, {withoutFormat})));
  EXPECT_EQ(std::vector<std::string>(), DelegationMessages(Delegated(provided, {DELEGATE})));
}

TEST_F(CheckSaml2DelegationTest, ChecksTheDelegateOfTheChosenConfirmationOnly) {
  Confirmation delegated = Bearer();
  delegated.details.nameId = DELEGATE;
  Saml2Assertion assertion = AssertionWith({Bearer(), delegated});
  EXPECT_TRUE(ChooseConfirmation(assertion, {}, AtSecond(0), ThrowingSink()));
  EXPECT_EQ(std::vector<std::string>(), DelegationMessages(assertion));
}

TEST(CheckAudienceRestrictions, RequiresAnAcceptedAudienceInEachRestriction) {
  VerifyOptions options;
  const auto messages = [&options](const std::vector<std::set<std::string>> &restrictions) {
    return MessagesOf([&](DeviationSink &sink) { CheckAudienceRestrictions(restrictions, options, nullptr, sink); });
  };
  EXPECT_EQ(std::vector<std::string>(), messages({{"urn:a"}, {"urn:b"}}));
  options.acceptedAudiences = {"urn:a", "urn:b"};
  EXPECT_EQ(std::vector<std::string>(), messages({}));
  EXPECT_EQ(std::vector<std::string>(), messages({{"urn:a"}, {"urn:b", "urn:c"}}));
  EXPECT_EQ(One("The token is restricted to other audiences: urn:c, urn:d"),
            messages({{"urn:a"}, {"urn:d", "urn:c"}, {"urn:b"}}));
  EXPECT_EQ((std::vector<std::string>{"The token is restricted to other audiences: urn:c",
                                      "The token is restricted to other audiences: urn:d"}),
            messages({{"urn:c"}, {"urn:d"}}));
  options.acceptUnrestrictedAudience = false;
  EXPECT_EQ(One("The token is not restricted to an audience"), messages({}));
  EXPECT_EQ(std::vector<std::string>(), messages({{"urn:a"}}));
}

/// Each step corrects the mistake that was refused before, so the refusals are in the order of the rules.
TEST_F(CheckSaml2PropertiesTest, RefusesWithTheFirstRuleThatFails) {
  Saml2Assertion assertion = WithSessions({AtSecond(-600)});
  Put(assertion, {Bearer().Until(AtSecond(-600))});
  assertion.details.confirmations[0].nameId = DELEGATE;
  assertion.common.Version = "1.1";
  assertion.common.ID = "1";
  assertion.common.Conditions.NotBefore = AtSecond(601);
  const auto expect = [&assertion](const std::string &refusal) {
    EXPECT_THROWS_MESSAGE(CheckSaml2Properties(assertion, {}), ParseException, refusal);
  };
  expect("Invalid token version");
  assertion.common.Version = "2.0";
  expect("Invalid token ID");
  assertion.common.ID = "_1";
  expect("Token start date is in the future: 2026-01-02T03:14:06.006Z");
  assertion.common.Conditions.NotBefore = AtSecond(-3600);
  expect("The subject confirmation has expired at: 2026-01-02T02:54:05.006Z");
  assertion.details.confirmations[0].notOnOrAfter = boost::none;
  expect("The session has ended at: 2026-01-02T02:54:05.006Z");
  assertion.details.authnStatements.clear();
  expect("Token SubjectConfirmation contains delegate id, but no delegation restriction is present");
  assertion.details.confirmations[0].nameId = boost::none;
  EXPECT_NO_THROW(CheckSaml2Properties(assertion, {}));
}

TEST_F(CheckSaml2PropertiesTest, ReadsTheClockOnce) {
  int looks = 0;
  const std::int64_t now = AtSecond(0).GetUtcTime();
  const Tarvel::ScopedEnvironment clock({[&looks, now] {
                                           ++looks;
                                           return now;
                                         },
                                         {}});
  Saml2Assertion assertion = WithSessions({AtSecond(1), AtSecond(2)});
  Put(assertion, {Bearer().Until(AtSecond(-600)), HolderOfKey().From(AtSecond(-1)), Bearer().Until(AtSecond(1))});
  CheckSaml2Properties(assertion, {});
  EXPECT_EQ(1, looks);
}

TEST_F(CheckSaml2PropertiesTest, UsesTheToleranceOfTheOptions) {
  VerifyOptions options;
  options.clockToleranceSec = 0;
  Saml2Assertion assertion = AssertionWith({Bearer()});
  assertion.common.Conditions.NotOnOrAfter = AtSecond(0);
  EXPECT_THROWS_MESSAGE(CheckSaml2Properties(assertion, options), ParseException,
                        "The token has expired at: 2026-01-02T03:04:05.006Z");
  assertion = WithSessions({AtSecond(0)});
  EXPECT_THROWS_MESSAGE(CheckSaml2Properties(assertion, options), ParseException,
                        "The session has ended at: 2026-01-02T03:04:05.006Z");
  options.clockToleranceSec = 1;
  EXPECT_NO_THROW(CheckSaml2Properties(assertion, options));
}

} // namespace
