// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_checks.h"

#include "support/recorded_deviations.h"
#include "unit/token/saml2_records.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;

constexpr const char *NO_KEY = "The holder-of-key confirmation has no usable key";

/// A confirmation for the test of all orders.
struct Candidate {
  Confirmation confirmation;
  bool fits;
  std::string reason; ///< why it cannot be used, if its kind is considered
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

/// The rule, written in another way than in the product. Returns the position of the chosen confirmation, or the
/// refusal.
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

// Tries each set of confirmations in each order, with and without each required kind.
TEST(ChooseConfirmation, ChoosesTheFirstUsableBearerOrOtherwiseTheFirstUsableHolderOfKey) {
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

TEST(ChooseConfirmation, ChoosesTheFirstOfSeveralUsableConfirmations) {
  EXPECT_EQ("1", Choice({AllCandidates()[1], AllCandidates()[0], AllCandidates()[0]}, {}));
  EXPECT_EQ("1", Choice({AllCandidates()[3], AllCandidates()[2], AllCandidates()[2]}, {}));
}

TEST(ChooseConfirmation, TriesTheNextConfirmationIfAnOptionExcludesOne) {
  VerifyOptions options;
  options.acceptedRecipients = {"https://here/"};
  std::vector<Candidate> order(3, AllCandidates()[0]);
  order[0].confirmation.details.recipient = std::string("https://there/");
  order[2].confirmation.details.recipient = std::string("https://here/");
  EXPECT_EQ("2", Choice(order, options));
}

TEST(ChooseConfirmation, RefusesATokenWithoutAConfirmation) {
  Saml2Assertion assertion = AssertionWith({});
  EXPECT_EQ(std::vector<std::string>(1, "The token has no subject confirmation"), MessagesOf([&](DeviationSink &sink) {
              EXPECT_FALSE(ChooseConfirmation(assertion, {}, AtSecond(0), sink));
            }));
}

TEST(ChooseConfirmation, SetsTheConfirmationOfTheSubject) {
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

TEST(ChooseConfirmation, LeavesNothingOfAConfirmationThatWasChosenBefore) {
  Confirmation first = HolderOfKey();
  first.details.nameId = DELEGATE;
  Saml2Assertion assertion = AssertionWith({first, Bearer()});
  VerifyOptions options;
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  EXPECT_TRUE(ChooseConfirmation(assertion, options, AtSecond(0), ThrowingSink()));
  EXPECT_TRUE(assertion.common.Subject.SubjectConfirmation.NameID);
  EXPECT_TRUE(ChooseConfirmation(assertion, {}, AtSecond(0), ThrowingSink()));
  EXPECT_EQ(1u, assertion.details.usedConfirmation);
  EXPECT_FALSE(assertion.common.Subject.SubjectConfirmation.NameID);
  EXPECT_EQ(nullptr, assertion.common.Subject.SubjectConfirmation.SubjectConfirmationData.certificate);
}

} // namespace
