// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_checks.h"

#include "support/recorded_deviations.h"
#include "unit/token/saml2_records.h"

#include <gtest/gtest.h>

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
constexpr const char *NO_KEY = "The holder-of-key confirmation has no usable key";

/// In all of these tests the time is 2026-01-02T03:04:05.006Z.
class ConfirmationChoiceTest : public ::testing::Test {
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
};

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

TEST_F(ConfirmationChoiceTest, AppliesTolerancesThatAreLongerThanTheRangeOfDates) {
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

// With the tolerance, each of these dates on its own would be accepted.
TEST_F(ConfirmationChoiceTest, RefusesDatesAtWhichTheTokenIsNeverValid) {
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

/// What a confirmation states (`boost::none` if nothing), and the refusal of each kind if the options require "wanted".
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

TEST_F(ConfirmationChoiceTest, ComparesAnExpectedRequestThatIsEmpty) {
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

TEST_F(ConfirmationChoiceTest, RefusesAnotherKindIfTheTokenHasTheRequiredOne) {
  const Saml2Assertion assertion = AssertionWith({Bearer(), HolderOfKey(), SenderVouches()});
  VerifyOptions options;
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  EXPECT_EQ("The token's confirmation is bearer, but holder-of-key is required", Refusal(assertion, options, 0));
  EXPECT_EQ("", Refusal(assertion, options, 1));
  EXPECT_EQ("Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'",
            Refusal(assertion, options, 2));
  EXPECT_EQ("", Refusal(AssertionWith({Bearer()}), options));
}

} // namespace
