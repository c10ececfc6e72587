// SPDX-License-Identifier: Apache-2.0
// Every wrong answer of the development service to each operation: checks the class and the whole message of the
// exception, and that the same service object works afterwards.
#include "integration/service/service_client.h"
#include "integration/service/wrong_answers.h"

#include <ssoclient/exceptions.h>
#include <tarvel/system/date_time.h>

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;
using TokenPtr = std::shared_ptr<const SamlToken>;

struct Operation {
  const char *name;
  std::function<std::string(const SecurityTokenService &, const SamlToken &)> run;
};

void PrintTo(const Operation &operation, std::ostream *out) {
  *out << operation.name;
}

std::string Result(const TokenPtr &token) {
  return token ? "token" : "null";
}

TokenSpec RenewableSpec() {
  TokenSpec spec = SpecFor(3600);
  spec.renewable = true;
  return spec;
}

const Operation OPERATIONS[] = {
    {"AcquireToken", [](const SecurityTokenService &service,
                        const SamlToken &) { return Result(service.AcquireToken(ALICE, PASSWORD, SpecFor(3600))); }},
    {"AcquireTokenByCertificate",
     [](const SecurityTokenService &service, const SamlToken &) {
       return Result(service.AcquireTokenByCertificate(SpecFor(3600)));
     }},
    {"AcquireTokenByToken",
     [](const SecurityTokenService &service, const SamlToken &held) {
       return Result(service.AcquireTokenByToken(held, SpecFor(3600)));
     }},
    {"RenewToken",
     [](const SecurityTokenService &service, const SamlToken &held) { return Result(service.RenewToken(held, 3600)); }},
    {"ValidateSubject",
     [](const SecurityTokenService &service, const SamlToken &held) {
       return std::string(service.ValidateSubject(held) ? "valid" : "not valid");
     }},
};

/// The outcome of an operation that gets the wrong answer, and then that of the same operation on the same service
/// object.
std::string OutcomesOf(const Operation &operation, const std::string &fault, const SamlToken &held) {
  const ServiceClient client("client", RunningService().FaultUrl(fault) + "/once/" + operation.name);
  const std::string outcome = OutcomeOf([&] { return operation.run(*client, held); }, RunningService().GetPort());
  return outcome + "; then " + operation.run(*client, held);
}

class EachOperationAnsweredWrongly : public testing::TestWithParam<Operation> {
protected:
  void Expect(const WrongAnswer &answer, const std::string &then) const {
    EXPECT_EQ(OutcomesOf(GetParam(), answer.fault, *m_held), answer.outcome + ("; then " + then)) << answer.fault;
  }

  const TokenPtr m_held = ServiceClient("client")->AcquireToken(ALICE, PASSWORD, RenewableSpec());
};

TEST_P(EachOperationAnsweredWrongly, ReportsTheAnswerAndWorksAfterwards) {
  const bool yieldsToken = GetParam().name != std::string("ValidateSubject");
  for (const WrongAnswer &answer : TO_ALL) {
    Expect(answer, yieldsToken ? "token" : "valid");
  }
}

INSTANTIATE_TEST_SUITE_P(SecurityTokenService, EachOperationAnsweredWrongly, testing::ValuesIn(OPERATIONS),
                         [](const auto &operation) { return std::string(operation.param.name); });

class EachTokenOperationAnsweredWrongly : public EachOperationAnsweredWrongly {};

TEST_P(EachTokenOperationAnsweredWrongly, RefusesAWrongTokenAndWorksAfterwards) {
  for (const WrongAnswer &answer : INSTEAD_OF_A_TOKEN) {
    Expect(answer, "token");
  }
}

INSTANTIATE_TEST_SUITE_P(SecurityTokenService, EachTokenOperationAnsweredWrongly,
                         testing::ValuesIn(std::begin(OPERATIONS), std::end(OPERATIONS) - 1),
                         [](const auto &operation) { return std::string(operation.param.name); });

TEST(ValidateSubjectAnsweredWrongly, RefusesAnUnknownStatus) {
  const TokenPtr held = ServiceClient()->AcquireToken(ALICE, PASSWORD, SpecFor(3600));
  EXPECT_EQ(OutcomesOf(std::end(OPERATIONS)[-1], "wrong-status", *held),
            "SsoException: Unexpected XML format; then valid");
}

/// The message of the exception that acquiring a token throws.
std::string MessageOf(const char *fault) {
  try {
    ServiceClient("", RunningService().FaultUrl(fault))->AcquireToken(ALICE, PASSWORD, SpecFor(3600));
  } catch (const SsoException &exception) {
    return exception.what();
  }
  return "nothing was thrown";
}

TEST(AcquireTokenOverTls, ReportsTheDateOfATokenThatIsNotValidNow) {
  constexpr std::int64_t DAY = 86400000000; // microseconds
  struct {
    const char *fault;
    std::string message;
    std::int64_t distance;
  } const cases[] = {{"expired-token", "The token has expired at: ", -DAY},
                     {"early-token", "Token start date is in the future: ", DAY}};
  for (const auto &expected : cases) {
    const std::int64_t begin = NowInMilliseconds();
    const std::string message = MessageOf(expected.fault);
    ASSERT_EQ(message.substr(0, expected.message.size()), expected.message);
    const Tarvel::System::DateTime date(message.substr(expected.message.size()));
    EXPECT_GE(date.GetUtcTime(), begin + expected.distance) << message;
    EXPECT_LE(date.GetUtcTime(), NowInMilliseconds() + expected.distance) << message;
  }
}

TEST(AcquireTokenOverTls, AcceptsAResponseThatArrivesSlowly) {
  const ServiceClient client("", RunningService().FaultUrl("drip-1"));
  EXPECT_EQ(DescribeFields(*client->AcquireToken(ALICE, PASSWORD, SpecFor(3600))), Describe({}));
}

TEST(AcquireTokenOverTls, LeavesAudienceAndConfirmationToTheCaller) {
  ExpectedFields elsewhere;
  elsewhere.audience = {"https://elsewhere.example/"};
  const ServiceClient wrongAudience("", RunningService().FaultUrl("wrong-audience"));
  EXPECT_EQ(DescribeFields(*wrongAudience->AcquireToken(ALICE, PASSWORD, SpecFor(3600))), Describe(elsewhere));
  const ServiceClient bearer("client", RunningService().FaultUrl("bearer-for-hok"));
  EXPECT_EQ(DescribeFields(*bearer->AcquireToken(ALICE, PASSWORD, SpecFor(3600))), Describe({}));
}

} // namespace
} // namespace SsoClient
