// SPDX-License-Identifier: Apache-2.0
// Every wrong answer of the development service to a negotiation by Kerberos ticket, in both its forms: the class and the
// whole message of the exception, and that the next negotiation succeeds.
#include "integration/gssapi/service_world.h"
#include "integration/service/wrong_answers.h"

#include <gtest/gtest.h>

#include <functional>
#include <ostream>
#include <string>

namespace SsoClient {
namespace {

using Gssapi::CreateSpnegoHandler;
using Testing::HourSpec;
using Testing::ServiceWorld;
using Testing::SettingsFor;
using Testing::WrongAnswer;

struct Form {
  const char *name;
  /// Whether a token that is not as it must be is reported as `ParseException`, and not as `SsoException`.
  bool raisesParseException;
  std::function<std::string(const SecurityTokenServiceConfig &)> negotiate;
};

void PrintTo(const Form &form, std::ostream *out) {
  *out << form.name;
}

const Form FORMS[] = {
    {"AcquireTokenByGSS", false,
     [](const SecurityTokenServiceConfig &config) {
       const auto handler = CreateSpnegoHandler(SettingsFor());
       return Testing::SubjectOf(*CreateSecurityTokenService(config)->AcquireTokenByGSS(HourSpec(), *handler));
     }},
    {"NegotiateToken", true,
     [](const SecurityTokenServiceConfig &config) {
       const auto handler = CreateSpnegoHandler(SettingsFor());
       int legs = 0;
       const auto context = InternalApi::CreateGssNegotiationContext(config, HourSpec());
       return Testing::SubjectOf(*Testing::NegotiateByHand(*context, *handler, legs));
     }},
};

class EachFormAnsweredWrongly : public testing::TestWithParam<Form> {
protected:
  /// How a negotiation ends whose first message is answered with the fault, and how the one after it.
  std::string OutcomesOf(const std::string &fault) const {
    const SecurityTokenServiceConfig config = m_world.MakeConfig(fault + "/once/" + GetParam().name);
    const auto negotiate = [&] { return GetParam().negotiate(config); };
    const std::string outcome = Testing::OutcomeOf(negotiate, m_world.GetService().GetPort());
    return outcome + "; then " + negotiate();
  }

  const ServiceWorld m_world;
};

constexpr char THEN_A_TOKEN[] = "; then alice@corp.example";

TEST_P(EachFormAnsweredWrongly, ReportsItAndNegotiatesAfterwards) {
  for (const WrongAnswer &answer : Testing::TO_ALL) {
    if (answer.fault == std::string("wrong-wrapper")) {
      continue; // without the collection it is a leg in the middle, see below
    }
    EXPECT_EQ(OutcomesOf(answer.fault), std::string(answer.outcome) + THEN_A_TOKEN) << answer.fault;
  }
}

TEST_P(EachFormAnsweredWrongly, HandsOutNoWrongTokenAndNegotiatesAfterwards) {
  const std::string service = "SsoException: ";
  for (const WrongAnswer &answer : Testing::INSTEAD_OF_A_TOKEN) {
    std::string outcome = answer.outcome;
    if (GetParam().raisesParseException && outcome.rfind(service, 0) == 0) {
      outcome.replace(0, service.size(), "ParseException: ");
    }
    EXPECT_EQ(OutcomesOf(answer.fault), outcome + THEN_A_TOKEN) << answer.fault;
  }
}

// The token in it does not count, and the service knows of no further leg.
TEST_P(EachFormAnsweredWrongly, GoesOnWhenTheFinalLegStandsOutsideItsCollection) {
  EXPECT_EQ(OutcomesOf("wrong-wrapper"),
            std::string("SsoException: Unexpected SOAP fault: wst:InvalidRequest; request failed.") + THEN_A_TOKEN);
}

INSTANTIATE_TEST_SUITE_P(Negotiation, EachFormAnsweredWrongly, testing::ValuesIn(FORMS),
                         [](const auto &form) { return std::string(form.param.name); });

} // namespace
} // namespace SsoClient
