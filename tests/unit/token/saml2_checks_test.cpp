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
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;

constexpr std::int64_t SMALLEST = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t LARGEST = std::numeric_limits<std::int64_t>::max();

constexpr const char *UNSATISFIABLE_CONFIRMATION =
    "Unsatisfiable token validity conditions: the subject confirmation cannot be used while the token is valid.";
constexpr const char *UNSATISFIABLE_SESSION =
    "Unsatisfiable token validity conditions: the session ends before the token starts.";
constexpr const char *NO_KEY = "The holder-of-key confirmation has no usable key";

/// In all of these tests the time is 2026-01-02T03:04:05.006Z.
class Saml2ChecksTest : public ::testing::Test {
protected:
  /// The first reason for which the confirmation at `index` cannot be used; empty if it can.
  static std::string Refusal(const Saml2Assertion &assertion, const VerifyOptions &options, std::size_t index = 0) {
    const DateTime now = AtSecond(0);
    const ConfirmationChoice choice(assertion, options, now);
    const std::vector<std::string> all = MessagesOf([&](DeviationSink &sink) { choice.Check(index, sink); });
    const boost::optional<Deviation> first = choice.GetRefusal(index);
    EXPECT_EQ(all.empty() ? std::string() : all.front(), first ? first->message : std::string());
    return first ? first->message : std::string();
  }

  /// The same for the only confirmation of an assertion.
  static std::string RefusalOf(const Confirmation &confirmation, const VerifyOptions &options = {}) {
    return Refusal(AssertionWith({confirmation}), options);
  }

  static std::vector<std::string> SessionMessages(const Saml2Assertion &assertion, std::int64_t tolerance = 600) {
    return MessagesOf([&](DeviationSink &sink) { CheckSessions(assertion, tolerance, AtSecond(0), sink); });
  }

  static std::vector<std::string> DelegationMessages(const Saml2Assertion &assertion) {
    return MessagesOf([&](DeviationSink &sink) { CheckSaml2Delegation(assertion, sink); });
  }

private:
  Tarvel::ScopedEnvironment m_clock{{[] { return AtSecond(0).GetUtcTime(); }, {}}};
};

using ConfirmationChoiceTest = Saml2ChecksTest;
using ChooseConfirmationTest = Saml2ChecksTest;
using CheckSaml2ValidityTest = Saml2ChecksTest;
using CheckSessionsTest = Saml2ChecksTest;
using CheckSaml2DelegationTest = Saml2ChecksTest;
using CheckSaml2PropertiesTest = Saml2ChecksTest;

std::vector<std::string> One(const std::string &message) {
  return {message};
}

TEST_F(ConfirmationChoiceTest, AcceptsABearerWithoutDataAndAHolderOfKeyWithAKey) {
  EXPECT_EQ("", RefusalOf(Bearer()));
  EXPECT_EQ("", RefusalOf(HolderOfKey()));
}

TEST_F(ConfirmationChoiceTest, RefusesAnUnknownMethod) {
  EXPECT_EQ("Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'",
            RefusalOf(SenderVouches()));
}

TEST_F(ConfirmationChoiceTest, RefusesAHolderOfKeyWithoutAUsableKey) {
  Confirmation confirmation = HolderOfKey();
  confirmation.details.publicKey.clear();
  EXPECT_EQ(NO_KEY, RefusalOf(confirmation));
}

TEST_F(ConfirmationChoiceTest, AppliesTheToleranceToTheStartToTheMicrosecond) {
  VerifyOptions options;
  for (const std::int64_t tolerance : {600, 0, -60}) {
    options.clockToleranceSec = tolerance;
    EXPECT_EQ("", RefusalOf(Bearer().From(AtSecond(tolerance)), options));
    const DateTime late = AtSecond(tolerance).PlusMicroseconds(1);
    EXPECT_EQ("The subject confirmation cannot be used before: " + late.ToString(),
              RefusalOf(Bearer().From(late), options));
  }
}

TEST_F(ConfirmationChoiceTest, AppliesTheToleranceToTheEndToTheMicrosecond) {
  VerifyOptions options;
  for (const std::int64_t tolerance : {600, 0, -60}) {
    options.clockToleranceSec = tolerance;
    EXPECT_EQ("", RefusalOf(Bearer().Until(AtSecond(-tolerance).PlusMicroseconds(1)), options));
    EXPECT_EQ("The subject confirmation has expired at: " + AtSecond(-tolerance).ToString(),
              RefusalOf(Bearer().Until(AtSecond(-tolerance)), options));
  }
}

TEST_F(ConfirmationChoiceTest, AppliesTheDatesToAHolderOfKey) {
  EXPECT_EQ("The subject confirmation cannot be used before: 2026-01-02T03:14:06.006Z",
            RefusalOf(HolderOfKey().From(AtSecond(601))));
  EXPECT_EQ("The subject confirmation has expired at: 2026-01-02T02:54:05.006Z",
            RefusalOf(HolderOfKey().Until(AtSecond(-600))));
}

TEST_F(ConfirmationChoiceTest, AppliesTolerancesThatAreLongerThanAllTime) {
  Saml2Assertion assertion = AssertionWith({Bearer().From(DateTime("9999-12-31T23:59:58Z"))});
  assertion.common.Conditions.NotOnOrAfter = DateTime("9999-12-31T23:59:59Z");
  VerifyOptions options;
  options.clockToleranceSec = LARGEST;
  EXPECT_EQ("", Refusal(assertion, options));
  assertion.common.Conditions.NotBefore = DateTime("0001-01-01T00:00:00Z");
  assertion.details.confirmations[0] = Bearer().Until(DateTime("0001-01-01T00:00:01Z")).details;
  EXPECT_EQ("", Refusal(assertion, options));
  options.clockToleranceSec = SMALLEST;
  EXPECT_EQ("The subject confirmation has expired at: 0001-01-01T00:00:01.000Z", Refusal(assertion, options));
  EXPECT_EQ("The subject confirmation has expired at: 2026-01-02T03:54:05.006Z",
            RefusalOf(Bearer().Until(AtSecond(3000)), options));
  EXPECT_EQ("The subject confirmation cannot be used before: 2026-01-02T02:14:05.006Z",
            RefusalOf(Bearer().From(AtSecond(-3000)), options));
}

TEST_F(ConfirmationChoiceTest, ReportsByHowManySecondsTheClockMissesTheDates) {
  const DateTime now = AtSecond(0);
  const auto missed = [&now](const Confirmation &confirmation) {
    const Saml2Assertion assertion = AssertionWith({confirmation});
    return ConfirmationChoice(assertion, {}, now).GetRefusal(0)->missedBySec;
  };
  EXPECT_EQ(1, missed(Bearer().From(AtSecond(601))));
  EXPECT_EQ(2, missed(Bearer().From(AtSecond(602))));
  EXPECT_EQ(1, missed(Bearer().Until(AtSecond(-600))));
  EXPECT_EQ(2, missed(Bearer().Until(AtSecond(-601))));
}

// With the tolerance, each date alone would be accepted.
TEST_F(ConfirmationChoiceTest, RefusesDatesThatAreNeverThoseOfTheToken) {
  EXPECT_EQ(UNSATISFIABLE_CONFIRMATION, RefusalOf(Bearer().From(AtSecond(10)).Until(AtSecond(10))));
  EXPECT_EQ("", RefusalOf(Bearer().From(AtSecond(10)).Until(AtSecond(11))));
  Saml2Assertion assertion = AssertionWith({Bearer().Until(AtSecond(-300))});
  assertion.common.Conditions.NotBefore = AtSecond(-300);
  EXPECT_EQ(UNSATISFIABLE_CONFIRMATION, Refusal(assertion, {}));
  assertion.common.Conditions.NotBefore = AtSecond(-301);
  EXPECT_EQ("", Refusal(assertion, {}));
  assertion = AssertionWith({Bearer().From(AtSecond(300))});
  assertion.common.Conditions.NotOnOrAfter = AtSecond(300);
  EXPECT_EQ(UNSATISFIABLE_CONFIRMATION, Refusal(assertion, {}));
  assertion.common.Conditions.NotOnOrAfter = AtSecond(301);
  EXPECT_EQ("", Refusal(assertion, {}));
}

/// What a confirmation states (none: nothing), and the refusals for each kind if the options demand "wanted".
struct StatedCase {
  boost::optional<std::string> stated;
  std::string ofBearer;
  std::string ofHolderOfKey;
};

TEST_F(ConfirmationChoiceTest, ComparesTheRecipientByteForByteIfOptionsHaveOne) {
  const std::string none = "The subject confirmation does not name a recipient";
  const std::string other = "The subject confirmation is for another recipient: ";
  VerifyOptions options;
  options.acceptedRecipients = {"https://also/", "https://wanted/"};
  for (const StatedCase &one :
       std::vector<StatedCase>{{boost::none, none, ""},
                               {std::string("https://wanted/"), "", ""},
                               {std::string("https://also/"), "", ""},
                               {std::string("https://wanted"), other + "https://wanted", other + "https://wanted"},
                               {std::string("https://Wanted/"), other + "https://Wanted/", other + "https://Wanted/"},
                               {std::string(), other, other}}) {
    Confirmation bearer = Bearer();
    Confirmation holderOfKey = HolderOfKey();
    bearer.details.recipient = holderOfKey.details.recipient = one.stated;
    EXPECT_EQ(one.ofBearer, RefusalOf(bearer, options));
    EXPECT_EQ(one.ofHolderOfKey, RefusalOf(holderOfKey, options));
    EXPECT_EQ("", RefusalOf(bearer));
    EXPECT_EQ("", RefusalOf(holderOfKey));
  }
}

TEST_F(ConfirmationChoiceTest, ComparesTheRequestByteForByteIfOptionsHaveOne) {
  const std::string none = "The subject confirmation does not state the request that it answers";
  const std::string other = "The subject confirmation answers another request: ";
  VerifyOptions options;
  options.expectedInResponseTo = std::string("_wanted");
  for (const StatedCase &one :
       std::vector<StatedCase>{{boost::none, none, ""},
                               {std::string("_wanted"), "", ""},
                               {std::string("_Wanted"), other + "_Wanted", other + "_Wanted"},
                               {std::string("_wanted "), other + "_wanted ", other + "_wanted "},
                               {std::string(), other, other}}) {
    Confirmation bearer = Bearer();
    Confirmation holderOfKey = HolderOfKey();
    bearer.details.inResponseTo = holderOfKey.details.inResponseTo = one.stated;
    EXPECT_EQ(one.ofBearer, RefusalOf(bearer, options));
    EXPECT_EQ(one.ofHolderOfKey, RefusalOf(holderOfKey, options));
    EXPECT_EQ("", RefusalOf(bearer));
    EXPECT_EQ("", RefusalOf(holderOfKey));
  }
}

TEST_F(ConfirmationChoiceTest, AnEmptyExpectedRequestIsNotTheSameAsNone) {
  VerifyOptions options;
  options.expectedInResponseTo = std::string();
  Confirmation confirmation = Bearer();
  EXPECT_EQ("The subject confirmation does not state the request that it answers", RefusalOf(confirmation, options));
  confirmation.details.inResponseTo = std::string();
  EXPECT_EQ("", RefusalOf(confirmation, options));
}

TEST_F(ConfirmationChoiceTest, ComparesTheAddressByteForByteIfOptionsAndConfirmationHaveOne) {
  const std::string other = "The subject confirmation is for a sender with another address: ";
  VerifyOptions options;
  options.senderAddress = std::string("192.0.2.1");
  for (const StatedCase &one :
       std::vector<StatedCase>{{boost::none, "", ""},
                               {std::string("192.0.2.1"), "", ""},
                               {std::string("192.0.2.10"), other + "192.0.2.10", other + "192.0.2.10"},
                               {std::string(), other, other}}) {
    Confirmation bearer = Bearer();
    Confirmation holderOfKey = HolderOfKey();
    bearer.details.address = holderOfKey.details.address = one.stated;
    EXPECT_EQ(one.ofBearer, RefusalOf(bearer, options));
    EXPECT_EQ(one.ofHolderOfKey, RefusalOf(holderOfKey, options));
    EXPECT_EQ("", RefusalOf(bearer));
    EXPECT_EQ("", RefusalOf(holderOfKey));
  }
}

TEST_F(ConfirmationChoiceTest, ReportsEveryReasonInOrderToASinkThatDoesNotThrow) {
  VerifyOptions options;
  options.acceptedRecipients = {"https://b/", "https://a/"};
  options.expectedInResponseTo = std::string("_1");
  options.senderAddress = std::string("192.0.2.1");
  Confirmation confirmation = HolderOfKey().From(AtSecond(601)).Until(AtSecond(-600));
  confirmation.details.recipient = std::string("https://c/");
  confirmation.details.inResponseTo = std::string("_2");
  confirmation.details.address = std::string("192.0.2.2");
  confirmation.details.publicKey.clear();
  const Saml2Assertion assertion = AssertionWith({confirmation});
  const DateTime now = AtSecond(0);
  const ConfirmationChoice choice(assertion, options, now);
  const std::string tolerance = " 2026-01-02T03:04:05.006Z, with a tolerance of 600 s";
  EXPECT_EQ((std::vector<ExpectedDeviation>{
                {"The subject confirmation cannot be used before: 2026-01-02T03:14:06.006Z", "", "NotBefore",
                 "at or before" + tolerance, "2026-01-02T03:14:06.006Z"},
                {"The subject confirmation has expired at: 2026-01-02T02:54:05.006Z", "", "NotOnOrAfter",
                 "after" + tolerance, "2026-01-02T02:54:05.006Z"},
                {UNSATISFIABLE_CONFIRMATION, "", "", "dates within those of the token",
                 "2026-01-02T03:14:06.006Z to 2026-01-02T02:54:05.006Z"},
                {"The subject confirmation is for another recipient: https://c/", "", "Recipient",
                 "https://a/, https://b/", "https://c/"},
                {"The subject confirmation answers another request: _2", "", "InResponseTo", "_1", "_2"},
                {"The subject confirmation is for a sender with another address: 192.0.2.2", "", "Address", "192.0.2.1",
                 "192.0.2.2"},
                {NO_KEY, "", "", "a certificate or an RSA or EC public key", ""},
            }),
            DeviationsOf([&](DeviationSink &sink) { choice.Check(0, sink); }));
  RecordedDeviations full(0);
  choice.Check(0, full);
  EXPECT_EQ(7u, full.unlisted);
}

/// A confirmation for the test of all orders.
struct Candidate {
  Confirmation confirmation;
  bool fits;
  std::string reason; ///< if it is considered
};

std::vector<Candidate> AllCandidates() {
  Confirmation noKey = HolderOfKey();
  noKey.details.publicKey.clear();
  return {
      {Bearer(), true, ""},
      {Bearer().Until(AtSecond(-600)), false, "The subject confirmation has expired at: 2026-01-02T02:54:05.006Z"},
      {HolderOfKey(), true, ""},
      {noKey, false, NO_KEY},
      {SenderVouches(), false, "Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'"}};
}

/// What the rule says, in other words than the product: the position of the chosen one, or the refusal.
std::string ExpectedChoice(const std::vector<Candidate> &order,
                           const boost::optional<SamlToken::ConfirmationType> &required) {
  const bool hasRequired = required && std::any_of(order.begin(), order.end(), [&](const Candidate &one) {
                             return one.confirmation.record.type == *required;
                           });
  for (const auto type : {SamlToken::BEARER, SamlToken::HOLDER_OF_KEY}) {
    for (std::size_t i = 0; i < order.size() && !(hasRequired && type != *required); ++i) {
      if (order[i].fits && order[i].confirmation.record.type == type) {
        return std::to_string(i);
      }
    }
  }
  for (const Candidate &one : order) {
    if (one.confirmation.record.type && (!hasRequired || one.confirmation.record.type == *required)) {
      return one.reason;
    }
  }
  return order.front().reason;
}

std::string Choice(const std::vector<Candidate> &order, const VerifyOptions &options) {
  std::vector<Confirmation> confirmations;
  for (const Candidate &one : order) {
    confirmations.push_back(one.confirmation);
  }
  Saml2Assertion assertion = AssertionWith(confirmations);
  try {
    EXPECT_TRUE(ChooseConfirmation(assertion, options, AtSecond(0), ThrowingSink()));
  } catch (const ParseException &refusal) {
    EXPECT_FALSE(assertion.common.Subject.SubjectConfirmation.isMethodKnown);
    RecordedDeviations recorded;
    EXPECT_FALSE(ChooseConfirmation(assertion, options, AtSecond(0), recorded));
    EXPECT_EQ(recorded.all.empty() ? "nothing" : recorded.all.front().message, refusal.what());
    return refusal.what();
  }
  const SubjectConfirmationType &used = assertion.common.Subject.SubjectConfirmation;
  EXPECT_TRUE(used.isMethodKnown);
  EXPECT_EQ(used.Method, *order[assertion.details.usedConfirmation].confirmation.record.type);
  return std::to_string(assertion.details.usedConfirmation);
}

// Each set of confirmations in each order, with and without each required kind.
TEST_F(ChooseConfirmationTest, ChoosesTheFirstBearerThatFitsAndElseTheFirstHolderOfKeyThatFits) {
  const std::vector<Candidate> candidates = AllCandidates();
  std::size_t tried = 0;
  for (unsigned chosen = 1; chosen < 1U << candidates.size(); ++chosen) {
    std::vector<std::size_t> order;
    for (std::size_t i = 0; i < candidates.size(); ++i) {
      if ((chosen >> i & 1U) != 0) {
        order.push_back(i);
      }
    }
    do {
      std::vector<Candidate> ordered;
      for (const std::size_t i : order) {
        ordered.push_back(candidates[i]);
      }
      VerifyOptions options;
      EXPECT_EQ(ExpectedChoice(ordered, boost::none), Choice(ordered, options));
      for (const auto required : {SamlToken::BEARER, SamlToken::HOLDER_OF_KEY}) {
        options.requiredConfirmation = required;
        EXPECT_EQ(ExpectedChoice(ordered, required), Choice(ordered, options));
      }
      ++tried;
    } while (std::next_permutation(order.begin(), order.end()));
  }
  EXPECT_EQ(325u, tried);
}

TEST_F(ChooseConfirmationTest, ChoosesTheFirstOfSeveralThatFit) {
  EXPECT_EQ("1", Choice({AllCandidates()[1], AllCandidates()[0], AllCandidates()[0]}, {}));
  EXPECT_EQ("1", Choice({AllCandidates()[3], AllCandidates()[2], AllCandidates()[2]}, {}));
}

TEST_F(ChooseConfirmationTest, TriesTheNextConfirmationIfOnlyAnOptionDoesNotFit) {
  VerifyOptions options;
  options.acceptedRecipients = {"https://here/"};
  std::vector<Candidate> order(3, AllCandidates()[0]);
  order[0].confirmation.details.recipient = std::string("https://there/");
  order[2].confirmation.details.recipient = std::string("https://here/");
  EXPECT_EQ("2", Choice(order, options));
}

TEST_F(ChooseConfirmationTest, SaysThatAKindIsNotConsideredIfTheRequiredOneIsThere) {
  const Saml2Assertion assertion = AssertionWith({Bearer(), HolderOfKey(), SenderVouches()});
  VerifyOptions options;
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  EXPECT_EQ("The token's confirmation is bearer, but holder-of-key is required", Refusal(assertion, options, 0));
  EXPECT_EQ("", Refusal(assertion, options, 1));
  EXPECT_EQ("Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'",
            Refusal(assertion, options, 2));
  EXPECT_EQ("", Refusal(AssertionWith({Bearer()}), options));
}

TEST_F(ChooseConfirmationTest, RefusesATokenWithoutAConfirmation) {
  Saml2Assertion assertion = AssertionWith({});
  EXPECT_EQ(One("The token has no subject confirmation"), MessagesOf([&](DeviationSink &sink) {
              EXPECT_FALSE(ChooseConfirmation(assertion, {}, AtSecond(0), sink));
            }));
}

TEST_F(ChooseConfirmationTest, SetsTheConfirmationOfTheSubject) {
  Confirmation chosen = HolderOfKey().Until(AtSecond(5));
  chosen.details.nameId = NameId{"backup", std::string("urn:format"), {}, {}, {}};
  Saml2Assertion assertion = AssertionWith({SenderVouches(), chosen, Bearer().Until(AtSecond(-600))});
  EXPECT_TRUE(ChooseConfirmation(assertion, {}, AtSecond(0), ThrowingSink()));
  const SubjectConfirmationType &used = assertion.common.Subject.SubjectConfirmation;
  EXPECT_EQ(1u, assertion.details.usedConfirmation);
  EXPECT_EQ(SamlToken::HOLDER_OF_KEY, used.Method);
  EXPECT_EQ((NameIDType{"urn:format", "backup"}), *used.NameID);
  EXPECT_EQ(AtSecond(5), used.SubjectConfirmationData.NotOnOrAfter);
  EXPECT_NE(nullptr, used.SubjectConfirmationData.certificate);
  EXPECT_EQ(chosen.details.certificate, used.SubjectConfirmationData.certificate);
}

TEST_F(CheckSaml2ValidityTest, IsThatOfTheProfileStrict) {
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

TEST_F(CheckSaml2DelegationTest, TakesNoFormatForUnspecifiedAndIgnoresTheProvidedId) {
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

/// Removes the first mistake each time, so that the rules appear in their order.
TEST_F(CheckSaml2PropertiesTest, RefusesByTheFirstRuleThatFails) {
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
