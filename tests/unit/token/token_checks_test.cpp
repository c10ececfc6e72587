// SPDX-License-Identifier: Apache-2.0

#include "token/token_checks.h"

#include "support/recorded_deviations.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/environment.h>

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using Tarvel::System::DateTime;
using Tarvel::System::DateTimeFromUtc;

constexpr std::int64_t SECOND = 1'000'000;
constexpr std::int64_t TOLERANCE_SEC = 600;
constexpr std::int64_t SMALLEST = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t LARGEST = std::numeric_limits<std::int64_t>::max();

const NameIDType GATEWAY{"urn:format", "gateway@corp"};
const NameIDType BACKUP{"urn:format", "backup@corp"};

class CheckTokenPropertiesTest : public ::testing::Test {
protected:
  static DateTime AtSecond(std::int64_t second) { return DateTimeFromUtc(m_now + second * SECOND, false); }

  /// A bearer token that is valid from an hour ago for two hours.
  static SamlAssertionType ValidAssertion() {
    SamlAssertionType assertion;
    assertion.Version = "2.0";
    assertion.ID = "_1";
    assertion.Conditions.NotBefore = AtSecond(-3600);
    assertion.Conditions.NotOnOrAfter = AtSecond(3600);
    assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter = AtSecond(3600);
    return assertion;
  }

  static SamlAssertionType HolderOfKey() {
    SamlAssertionType assertion = ValidAssertion();
    assertion.Subject.SubjectConfirmation.Method = SamlToken::HOLDER_OF_KEY;
    return assertion;
  }

  /// A holder-of-key token: with a bearer token, a second rule would compare the end.
  static SamlAssertionType ValidBetween(std::int64_t from, std::int64_t to) {
    SamlAssertionType assertion = HolderOfKey();
    assertion.Conditions.NotBefore = AtSecond(from);
    assertion.Conditions.NotOnOrAfter = AtSecond(to);
    return assertion;
  }

  static void Check(const SamlAssertionType &assertion) { CheckTokenProperties(assertion, TOLERANCE_SEC); }

private:
  static inline const std::int64_t m_now = DateTime("2026-01-02T03:04:05.006Z").GetUtcTime();
  Tarvel::ScopedEnvironment m_clock{{[] { return m_now; }, {}}};
};

TEST_F(CheckTokenPropertiesTest, AcceptsACurrentToken) {
  EXPECT_NO_THROW(Check(ValidAssertion()));
  EXPECT_NO_THROW(Check(HolderOfKey()));
}

TEST_F(CheckTokenPropertiesTest, RefusesEveryOtherVersion) {
  for (const std::string version : {"", "2", "2.0 ", " 2.0", "2.00", "1.1", "2.1"}) {
    SamlAssertionType assertion = ValidAssertion();
    assertion.Version = version;
    EXPECT_THROWS_MESSAGE(Check(assertion), ParseException, "Invalid token version");
  }
}

TEST_F(CheckTokenPropertiesTest, RefusesAnIdThatDoesNotBeginWithAnUnderscore) {
  for (const std::string id : {"", "123", "a_", " _1"}) {
    SamlAssertionType assertion = ValidAssertion();
    assertion.ID = id;
    EXPECT_THROWS_MESSAGE(Check(assertion), ParseException, "Invalid token ID");
  }
}

TEST_F(CheckTokenPropertiesTest, AcceptsDigitsAfterAnUnderscore) {
  SamlAssertionType assertion = ValidAssertion();
  for (const std::string id : {"_123", "_"}) {
    assertion.ID = id;
    EXPECT_NO_THROW(Check(assertion)) << id;
  }
}

TEST_F(CheckTokenPropertiesTest, RefusesAnEmptyValidityBeforeItReadsTheClock) {
  const std::string message = "Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.";
  EXPECT_THROWS_MESSAGE(Check(ValidBetween(0, 0)), ParseException, message);
  EXPECT_THROWS_MESSAGE(Check(ValidBetween(1, 0)), ParseException, message);
  EXPECT_THROWS_MESSAGE(Check(ValidBetween(9000, 9000)), ParseException, message);
  EXPECT_THROWS_MESSAGE(Check(ValidBetween(-9000, -9000)), ParseException, message);
}

TEST_F(CheckTokenPropertiesTest, ComparesInstantsWhateverTheirZone) {
  SamlAssertionType assertion = HolderOfKey();
  assertion.Conditions.NotBefore = DateTime("2026-01-02T05:00:00+02:00");
  assertion.Conditions.NotOnOrAfter = DateTime("2026-01-02T03:00:01Z");
  EXPECT_NO_THROW(Check(assertion));
}

TEST_F(CheckTokenPropertiesTest, AcceptsAStartWithinTheTolerance) {
  EXPECT_NO_THROW(Check(ValidBetween(599, 3600)));
  EXPECT_NO_THROW(Check(ValidBetween(600, 3600)));
}

TEST_F(CheckTokenPropertiesTest, RefusesAStartBeyondTheTolerance) {
  EXPECT_THROWS_MESSAGE(Check(ValidBetween(601, 3600)), ParseException,
                        "Token start date is in the future: 2026-01-02T03:14:06.006Z");
}

TEST_F(CheckTokenPropertiesTest, AcceptsAnEndWithinTheTolerance) {
  EXPECT_NO_THROW(Check(ValidBetween(-3600, -599)));
}

TEST_F(CheckTokenPropertiesTest, RefusesAnEndAtTheToleranceAndReportsTheEndWithoutTolerance) {
  EXPECT_THROWS_MESSAGE(Check(ValidBetween(-3600, -600)), ParseException,
                        "The token has expired at: 2026-01-02T02:54:05.006Z");
  EXPECT_THROWS_MESSAGE(Check(ValidBetween(-3600, -601)), ParseException,
                        "The token has expired at: 2026-01-02T02:54:04.006Z");
}

TEST_F(CheckTokenPropertiesTest, ShortensTheValidityByANegativeTolerance) {
  EXPECT_NO_THROW(CheckTokenProperties(ValidBetween(-60, 61), -60));
  EXPECT_THROWS_MESSAGE(CheckTokenProperties(ValidBetween(-59, 3600), -60), ParseException,
                        "Token start date is in the future: 2026-01-02T03:03:06.006Z");
  EXPECT_THROWS_MESSAGE(CheckTokenProperties(ValidBetween(-3600, 60), -60), ParseException,
                        "The token has expired at: 2026-01-02T03:05:05.006Z");
}

TEST_F(CheckTokenPropertiesTest, AcceptsEveryValidityWithAToleranceLongerThanAllTime) {
  SamlAssertionType assertion = HolderOfKey();
  for (const std::int64_t tolerance : {LARGEST, LARGEST / SECOND, LARGEST / SECOND + 1}) {
    assertion.Conditions.NotBefore = DateTime("0001-01-01T00:00:00Z");
    assertion.Conditions.NotOnOrAfter = DateTime("0001-01-01T00:00:01Z");
    EXPECT_NO_THROW(CheckTokenProperties(assertion, tolerance));
    assertion.Conditions.NotBefore = DateTime("9999-12-31T23:59:58Z");
    assertion.Conditions.NotOnOrAfter = DateTime("9999-12-31T23:59:59Z");
    EXPECT_NO_THROW(CheckTokenProperties(assertion, tolerance));
  }
}

TEST_F(CheckTokenPropertiesTest, RefusesEveryValidityWithANegativeToleranceLongerThanAllTime) {
  for (const std::int64_t tolerance : {SMALLEST, SMALLEST / SECOND, SMALLEST / SECOND - 1}) {
    EXPECT_THROWS_MESSAGE(CheckTokenProperties(ValidAssertion(), tolerance), ParseException,
                          "Token start date is in the future: 2026-01-02T02:04:05.006Z");
  }
}

// A date is always in the years 1 to 9999; with the tolerance, a validity may begin before them and end after them.
TEST_F(CheckTokenPropertiesTest, AppliesTheToleranceBeyondTheFirstAndTheLastDate) {
  const DateTime first("0001-01-01T00:00:00Z");
  const DateTime last("9999-12-31T23:59:59.999999Z");
  SamlAssertionType assertion = HolderOfKey();
  assertion.Conditions.NotBefore = first;
  assertion.Conditions.NotOnOrAfter = last;
  {
    const Tarvel::ScopedEnvironment clock({[&last] { return last.GetUtcTime(); }, {}});
    EXPECT_NO_THROW(CheckTokenProperties(assertion, 1));
    EXPECT_THROWS_MESSAGE(CheckTokenProperties(assertion, 0), ParseException,
                          "The token has expired at: 9999-12-31T23:59:59.999Z");
    assertion.Conditions.NotBefore = last.PlusSeconds(-1);
    EXPECT_THROWS_MESSAGE(CheckTokenProperties(assertion, -2), ParseException,
                          "Token start date is in the future: 9999-12-31T23:59:58.999Z");
  }
  const Tarvel::ScopedEnvironment clock({[&first] { return first.GetUtcTime(); }, {}});
  assertion.Conditions.NotBefore = first;
  assertion.Conditions.NotOnOrAfter = first.PlusSeconds(1);
  EXPECT_NO_THROW(CheckTokenProperties(assertion, 0));
  EXPECT_THROWS_MESSAGE(CheckTokenProperties(assertion, -1), ParseException,
                        "Token start date is in the future: 0001-01-01T00:00:00.000Z");
}

TEST_F(CheckTokenPropertiesTest, RefusesABearerSubjectThatEndsBeforeTheToken) {
  SamlAssertionType assertion = ValidAssertion();
  assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter = AtSecond(3599);
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException, "Invalid token subject validity");
  EXPECT_THROWS_MESSAGE(CheckTokenProperties(assertion, LARGEST), ParseException, "Invalid token subject validity");
}

TEST_F(CheckTokenPropertiesTest, AcceptsABearerSubjectThatEndsLater) {
  SamlAssertionType assertion = ValidAssertion();
  assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter = AtSecond(3601);
  EXPECT_NO_THROW(Check(assertion));
}

TEST_F(CheckTokenPropertiesTest, IgnoresTheEndOfAHolderOfKeySubject) {
  SamlAssertionType assertion = HolderOfKey();
  assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter = AtSecond(3599);
  EXPECT_NO_THROW(Check(assertion));
}

SamlAssertionType WithDelegation(SamlAssertionType assertion, const boost::optional<NameIDType> &delegateId,
                                 const std::vector<NameIDType> &delegates) {
  assertion.Subject.SubjectConfirmation.NameID = delegateId;
  if (!delegates.empty()) {
    assertion.Conditions.DelegationRestriction.emplace();
  }
  for (const NameIDType &delegate : delegates) {
    assertion.Conditions.DelegationRestriction->delegates.push_back({DateTime(), delegate});
  }
  return assertion;
}

TEST_F(CheckTokenPropertiesTest, AcceptsADelegateIdThatIsTheLastDelegate) {
  EXPECT_NO_THROW(Check(WithDelegation(ValidAssertion(), BACKUP, {BACKUP})));
  EXPECT_NO_THROW(Check(WithDelegation(ValidAssertion(), BACKUP, {GATEWAY, BACKUP})));
}

TEST_F(CheckTokenPropertiesTest, RefusesADelegateIdThatIsNotTheLastDelegate) {
  const std::string message = "The SubjectConfirmation delegate id does not match the id of the last delegate";
  EXPECT_THROWS_MESSAGE(Check(WithDelegation(ValidAssertion(), GATEWAY, {GATEWAY, BACKUP})), ParseException, message);
  EXPECT_THROWS_MESSAGE(Check(WithDelegation(ValidAssertion(), NameIDType{"urn:other", BACKUP.value}, {BACKUP})),
                        ParseException, message);
  EXPECT_THROWS_MESSAGE(Check(WithDelegation(ValidAssertion(), NameIDType{BACKUP.Format, "Backup@corp"}, {BACKUP})),
                        ParseException, message);
}

TEST_F(CheckTokenPropertiesTest, RefusesADelegateIdWithoutDelegation) {
  EXPECT_THROWS_MESSAGE(Check(WithDelegation(ValidAssertion(), BACKUP, {})), ParseException,
                        "Token SubjectConfirmation contains delegate id, but no delegation restriction is present");
}

TEST_F(CheckTokenPropertiesTest, RefusesDelegationWithoutADelegateId) {
  EXPECT_THROWS_MESSAGE(Check(WithDelegation(ValidAssertion(), boost::none, {BACKUP})), ParseException,
                        "Token has delegation restriction, but no delegate id is present in the SubjectConfirmation");
}

TEST_F(CheckTokenPropertiesTest, ReportsTheFirstRuleThatFails) {
  SamlAssertionType assertion = WithDelegation(ValidBetween(9000, 9000), BACKUP, {});
  assertion.Version = "3";
  assertion.ID = "";
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException, "Invalid token version");
  assertion.Version = "2.0";
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException, "Invalid token ID");
  assertion.ID = "_1";
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException,
                        "Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.");
  assertion.Conditions.NotOnOrAfter = AtSecond(9001);
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException,
                        "Token start date is in the future: 2026-01-02T05:34:05.006Z");
}

TEST_F(CheckTokenPropertiesTest, ReportsTheFirstRuleThatABearerTokenFails) {
  SamlAssertionType assertion = WithDelegation(ValidAssertion(), BACKUP, {});
  DateTime &subjectEnd = assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter;
  assertion.Conditions.NotOnOrAfter = AtSecond(-600);
  subjectEnd = AtSecond(-601);
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException, "The token has expired at: 2026-01-02T02:54:05.006Z");
  assertion.Conditions.NotOnOrAfter = AtSecond(3600);
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException, "Invalid token subject validity");
  subjectEnd = AtSecond(3600);
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException,
                        "Token SubjectConfirmation contains delegate id, but no delegation restriction is present");
}

TEST_F(CheckTokenPropertiesTest, ReadsTheClockOnce) {
  int looks = 0;
  const std::int64_t now = AtSecond(0).GetUtcTime();
  const auto look = [&looks, now] {
    ++looks;
    return now;
  };
  const Tarvel::ScopedEnvironment clock({look, {}});
  Check(ValidAssertion());
  EXPECT_EQ(looks, 1);
}

TEST_F(CheckTokenPropertiesTest, ReadsTheClockOnlyAfterItHasCheckedVersionIdAndOrderOfDates) {
  int looks = 0;
  const Tarvel::ScopedEnvironment clock({[&looks] { return ++looks; }, {}});
  SamlAssertionType assertion = ValidBetween(0, 0);
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException,
                        "Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.");
  assertion.ID = "";
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException, "Invalid token ID");
  assertion.Version = "";
  EXPECT_THROWS_MESSAGE(Check(assertion), ParseException, "Invalid token version");
  EXPECT_EQ(0, looks);
}

TEST_F(CheckTokenPropertiesTest, ReportsEveryFailedRuleToASinkThatDoesNotThrow) {
  SamlAssertionType assertion = WithDelegation(ValidBetween(3601, -3601), BACKUP, {});
  assertion.Subject.SubjectConfirmation.Method = SamlToken::BEARER;
  assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter = AtSecond(-3602);
  Testing::RecordedDeviations sink;
  CheckVersion(SamlAssertionType(), sink);
  CheckId(SamlAssertionType(), sink);
  EXPECT_EQ(AtSecond(0), CheckValidity(assertion.Conditions, TOLERANCE_SEC, sink));
  CheckSubjectValidity(assertion, sink);
  CheckDelegation(assertion, sink);
  std::vector<std::string> messages;
  for (const Deviation &deviation : sink.all) {
    messages.push_back(deviation.message);
  }
  EXPECT_EQ((std::vector<std::string>{
                "Invalid token version", "Invalid token ID",
                "Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.",
                "Token start date is in the future: 2026-01-02T04:04:06.006Z",
                "The token has expired at: 2026-01-02T02:04:04.006Z", "Invalid token subject validity",
                "Token SubjectConfirmation contains delegate id, but no delegation restriction is present"}),
            messages);
}

/// By how many seconds the clock misses a validity; 0 if it is within the validity.
std::int64_t MissedBySec(const ConditionsType &conditions, std::int64_t clockToleranceSec) {
  Testing::RecordedDeviations sink;
  CheckValidity(conditions, clockToleranceSec, sink);
  return sink.all.empty() ? 0 : sink.all.back().missedBySec;
}

// The token would be accepted if the clock were changed by this many seconds: the smallest whole number.
TEST_F(CheckTokenPropertiesTest, ReportsByHowManySecondsTheClockMissesTheToleratedValidity) {
  const auto missed = [](std::int64_t from, std::int64_t to) {
    return MissedBySec(ValidBetween(from, to).Conditions, TOLERANCE_SEC);
  };
  EXPECT_EQ(0, missed(600, 3600));
  EXPECT_EQ(1, missed(601, 3600));
  EXPECT_EQ(3000, missed(3600, 7200));
  EXPECT_EQ(0, missed(-3600, -599));
  EXPECT_EQ(1, missed(-3600, -600));
  EXPECT_EQ(2, missed(-3600, -601));
  ConditionsType conditions = ValidBetween(600, 3600).Conditions;
  conditions.NotBefore = conditions.NotBefore.PlusMicroseconds(1);
  EXPECT_EQ(1, MissedBySec(conditions, TOLERANCE_SEC));
  conditions.NotBefore = conditions.NotBefore.PlusMicroseconds(SECOND);
  EXPECT_EQ(2, MissedBySec(conditions, TOLERANCE_SEC));
}

TEST_F(CheckTokenPropertiesTest, ReportsTheSecondsOfAToleranceThatIsLongerThanAllTime) {
  Testing::RecordedDeviations sink;
  CheckValidity(ValidBetween(-3600, 3600).Conditions, SMALLEST, sink);
  ASSERT_EQ(2u, sink.all.size());
  EXPECT_EQ(9223372033255, sink.all[0].missedBySec);
  EXPECT_EQ(9223372033255, sink.all[1].missedBySec);
}

TEST(CheckAudience, JoinsTheAudiencesInTheirOrder) {
  VerifyOptions options;
  options.acceptedAudiences = {"urn:c"};
  EXPECT_THROWS_MESSAGE(CheckAudience({"urn:b", "urn:a"}, options, nullptr, ThrowingSink()), ParseException,
                        "The token is restricted to other audiences: urn:a, urn:b");
  EXPECT_EQ("", JoinTexts({}));
  EXPECT_EQ("urn:a", JoinTexts({"urn:a"}));
}

} // namespace
