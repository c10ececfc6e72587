// SPDX-License-Identifier: Apache-2.0
// Every wrong answer of the development service to a negotiation by Kerberos ticket, in both forms of negotiation:
// checks the class and the whole message of the exception, and that the next negotiation succeeds.
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
  /// Whether a wrong token is reported as `ParseException`, and not as `SsoException`.
  bool throwsParseException;
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

class EachFormOfNegotiationAnsweredWrongly : public testing::TestWithParam<Form> {
protected:
  /// The outcome of a negotiation whose first message gets the wrong answer, and then that of the next negotiation.
  std::string OutcomesOf(const std::string &fault) const {
    const SecurityTokenServiceConfig config = m_world.MakeConfig(fault + "/once/" + GetParam().name);
    const auto negotiate = [&] { return GetParam().negotiate(config); };
    const std::string outcome = Testing::OutcomeOf(negotiate, m_world.GetService().GetPort());
    return outcome + "; then " + negotiate();
  }

  const ServiceWorld m_world;
};

constexpr char THEN_A_TOKEN[] = "; then alice@corp.example";

TEST_P(EachFormOfNegotiationAnsweredWrongly, ReportsTheAnswerAndNegotiatesAfterwards) {
  for (const WrongAnswer &answer : Testing::TO_ALL) {
    if (answer.fault == std::string("wrong-wrapper")) {
      continue; // without the collection it looks like a leg that is not the last, see below
    }
    EXPECT_EQ(OutcomesOf(answer.fault), std::string(answer.outcome) + THEN_A_TOKEN) << answer.fault;
  }
}

TEST_P(EachFormOfNegotiationAnsweredWrongly, RefusesAWrongTokenAndNegotiatesAfterwards) {
  const std::string service = "SsoException: ";
  for (const WrongAnswer &answer : Testing::INSTEAD_OF_A_TOKEN) {
    std::string outcome = answer.outcome;
    if (GetParam().throwsParseException && outcome.rfind(service, 0) == 0) {
      outcome.replace(0, service.size(), "ParseException: ");
    }
    EXPECT_EQ(OutcomesOf(answer.fault), outcome + THEN_A_TOKEN) << answer.fault;
  }
}

// The token in the final leg is ignored then, and the service expects no further leg.
TEST_P(EachFormOfNegotiationAnsweredWrongly, ContinuesWhenTheFinalLegIsOutsideItsCollection) {
  EXPECT_EQ(OutcomesOf("wrong-wrapper"),
            std::string("SsoException: Unexpected SOAP fault: wst:InvalidRequest; request failed.") + THEN_A_TOKEN);
}

INSTANTIATE_TEST_SUITE_P(Negotiation, EachFormOfNegotiationAnsweredWrongly, testing::ValuesIn(FORMS),
                         [](const auto &form) { return std::string(form.param.name); });

} // namespace
} // namespace SsoClient
