// SPDX-License-Identifier: Apache-2.0
// Every wrong answer of the development service, to each operation: the class and the whole message of the exception, and
// that the same service object works afterwards.
#include "integration/service/service_client.h"

#include <ssoclient/exceptions.h>
#include <tarvel/system/date_time.h>

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <ostream>
#include <regex>
#include <string>
#include <typeinfo>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;
using TokenPtr = std::shared_ptr<const SamlToken>;

struct WrongAnswer {
  const char *fault;
  /// "CLASS: MESSAGE" of the exception. %e stands for the endpoint, and what differs from one answer to the next is
  /// reduced: lines, columns and lengths to "#", dates to "DATE".
  const char *outcome;
};

/// Nothing that is thrown but one of these.
std::string ClassOf(const std::exception &exception) {
  const struct {
    const std::type_info &type;
    const char *name;
  } classes[] = {{typeid(SsoException), "SsoException"},
                 {typeid(InvalidCredentialsException), "InvalidCredentialsException"},
                 {typeid(CommunicationException), "CommunicationException"},
                 {typeid(InvalidSignatureException), "InvalidSignatureException"}};
  for (const auto &known : classes) {
    if (known.type == typeid(exception)) {
      return known.name;
    }
  }
  return typeid(exception).name();
}

std::string Reduce(std::string message) {
  const struct {
    std::string pattern;
    const char *replacement;
  } reductions[] = {{"localhost:" + std::to_string(RunningService().GetPort()), "%e"},
                    {"line [0-9]+, column", "line #, column"},
                    {"column [0-9]+", "column #"},
                    {"after [0-9]+ of the body's [0-9]+ bytes", "after # of the body's # bytes"},
                    {R"(\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d\.\d{3}Z)", "DATE"}};
  for (const auto &reduction : reductions) {
    message = std::regex_replace(message, std::regex(reduction.pattern), reduction.replacement);
  }
  return message;
}

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

/// Outcome of the operation that `run` runs on a service at `url`, and then of the same on the same service.
std::string OutcomesOf(const Operation &operation, const std::string &fault, const SamlToken &held) {
  const ServiceClient client("client", RunningService().FaultUrl(fault) + "/once/" + operation.name);
  std::string outcome;
  try {
    outcome = operation.run(*client, held);
  } catch (const std::exception &exception) {
    outcome = ClassOf(exception) + ": " + Reduce(exception.what());
  }
  return outcome + "; then " + operation.run(*client, held);
}

// Whatever was asked for.
const WrongAnswer TO_ALL[] = {
    {"reset", "CommunicationException: The TLS connection to localhost broke: The connection to %e broke: Connection "
              "reset by peer"},
    {"reset-in-header", "CommunicationException: The TLS connection to localhost broke: The connection to %e broke: "
                        "Connection reset by peer"},
    {"reset-in-body", "CommunicationException: The TLS connection to localhost broke: The connection to %e broke: "
                      "Connection reset by peer"},
    {"truncate", "CommunicationException: Bad response from %e: the connection ended after # of the body's # bytes"},
    {"oversize", "CommunicationException: Bad response from %e: the body is longer than 16777216 bytes"},
    {"bad-status", "CommunicationException: Server returned error: 503 Service Unavailable"},
    {"bad-status-404", "CommunicationException: Server returned error: 404 Not Found"},
    {"bad-status-302", "CommunicationException: Server returned error: 302 Status"},
    {"bad-content-length",
     "CommunicationException: Bad response from %e: its header is not HTTP/1.x (bad Content-Length)"},
    {"garbage", "CommunicationException: Bad response from %e: its header is not HTTP/1.x (bad version)"},
    {"bad-status-200", "SsoException: Response is not well-formed XML: Start tag expected, '<' not found at line #, "
                       "column #"},
    {"bad-status-500", "SsoException: Response is not well-formed XML: Start tag expected, '<' not found at line #, "
                       "column #"},
    {"garbled-xml", "SsoException: Response is not well-formed XML: Opening and ending tag mismatch: Envelope line 1 "
                    "and garbled at line #, column #"},
    {"doctype", "SsoException: Response is not well-formed XML: a document type declaration is not accepted at line "
                "#, column #"},
    {"too-deep",
     "SsoException: Response is not well-formed XML: elements are nested deeper than 256 at line #, column #"},
    {"empty-body", "SsoException: Response is not well-formed XML: Document is empty at line #, column #"},
    {"not-soap", "SsoException: Unexpected response format: missing SAOP Body."},
    {"wrong-root", "SsoException: Unexpected response format: missing SAOP Body."},
    {"no-token", "SsoException: Unexpected XML format"},
    {"wrong-element", "SsoException: Unexpected XML format"},
    {"wrong-wrapper", "SsoException: Unexpected XML format"},
    {"soap-fault-without-code", "SsoException: Invalid SOAP response: missing faultcode."},
    {"soap-fault-without-text", "InvalidCredentialsException: Authentication failed"},
    {"soap-fault-FailedAuthentication", "InvalidCredentialsException: Authentication failed: a fault was asked for"},
    {"soap-fault-InvalidSecurityToken", "InvalidCredentialsException: Authentication failed: a fault was asked for"},
    {"soap-fault-wsse-InvalidSecurityToken",
     "InvalidCredentialsException: Authentication failed: a fault was asked for"},
    {"soap-fault-wsse-FailedAuthentication",
     "SsoException: Unexpected SOAP fault: wsse:FailedAuthentication; request failed."},
    {"soap-fault-InvalidRequest", "SsoException: Unexpected SOAP fault: wst:InvalidRequest; request failed."},
    {"soap-fault-RequestFailed", "SsoException: Unexpected SOAP fault: wst:RequestFailed; request failed."},
    {"soap-fault-InvalidTimeRange", "SsoException: Unexpected SOAP fault: wst:InvalidTimeRange; request failed."},
    {"soap-fault-UnableToRenew", "SsoException: Unexpected SOAP fault: wst:UnableToRenew; request failed."},
    {"soap-fault-InvalidSecurity", "SsoException: Unexpected SOAP fault: wsse:InvalidSecurity; request failed."},
    {"soap-fault-FailedCheck", "SsoException: Unexpected SOAP fault: wsse:FailedCheck; request failed."},
    {"soap-fault-MessageExpired", "SsoException: Unexpected SOAP fault: wsu:MessageExpired; request failed."},
    {"soap-fault-Unknown", "SsoException: Unexpected SOAP fault: devsts:Unknown; request failed."},
};

// Where a token was asked for.
const WrongAnswer INSTEAD_OF_A_TOKEN[] = {
    {"expired-token", "SsoException: The token has expired at: DATE"},
    {"early-token", "SsoException: Token start date is in the future: DATE"},
    {"tampered-token", "InvalidSignatureException: Failed to verify signature: token might have been tampered with."},
    {"wrong-signer", "InvalidSignatureException: Failed to verify signature: token might have been tampered with."},
    {"unsigned-token", "SsoException: Signature syntax error: Expected ds:Signature, found \"saml:Subject\" at line #, "
                       "column #"},
    {"no-subject", "SsoException: Expected element 'Subject' not found."},
    {"unknown-element", "SsoException: Unexpected elements under Assertion"},
    {"wrong-version", "SsoException: Invalid token version"},
};

class EachOperationAnsweredWrongly : public testing::TestWithParam<Operation> {
protected:
  void Expect(const WrongAnswer &answer, const std::string &then) const {
    EXPECT_EQ(OutcomesOf(GetParam(), answer.fault, *m_held), answer.outcome + ("; then " + then)) << answer.fault;
  }

  const TokenPtr m_held = ServiceClient("client")->AcquireToken(ALICE, PASSWORD, RenewableSpec());
};

TEST_P(EachOperationAnsweredWrongly, ReportsItAndWorksAfterwards) {
  const bool yieldsToken = GetParam().name != std::string("ValidateSubject");
  for (const WrongAnswer &answer : TO_ALL) {
    Expect(answer, yieldsToken ? "token" : "valid");
  }
}

INSTANTIATE_TEST_SUITE_P(SecurityTokenService, EachOperationAnsweredWrongly, testing::ValuesIn(OPERATIONS),
                         [](const auto &operation) { return std::string(operation.param.name); });

class EachTokenOperationAnsweredWrongly : public EachOperationAnsweredWrongly {};

TEST_P(EachTokenOperationAnsweredWrongly, HandsOutNoWrongTokenAndWorksAfterwards) {
  for (const WrongAnswer &answer : INSTEAD_OF_A_TOKEN) {
    Expect(answer, "token");
  }
}

INSTANTIATE_TEST_SUITE_P(SecurityTokenService, EachTokenOperationAnsweredWrongly,
                         testing::ValuesIn(std::begin(OPERATIONS), std::end(OPERATIONS) - 1),
                         [](const auto &operation) { return std::string(operation.param.name); });

TEST(ValidateSubjectAnsweredWrongly, TakesNoUnknownStatusForAVerdict) {
  const TokenPtr held = ServiceClient()->AcquireToken(ALICE, PASSWORD, SpecFor(3600));
  EXPECT_EQ(OutcomesOf(std::end(OPERATIONS)[-1], "wrong-status", *held),
            "SsoException: Unexpected XML format; then valid");
}

/// The message of the exception that acquiring a token raises.
std::string MessageOf(const char *fault) {
  try {
    ServiceClient("", RunningService().FaultUrl(fault))->AcquireToken(ALICE, PASSWORD, SpecFor(3600));
  } catch (const SsoException &exception) {
    return exception.what();
  }
  return "nothing was thrown";
}

TEST(AcquireTokenOverTls, NamesTheDateOfATokenThatIsNotCurrent) {
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

TEST(AcquireTokenOverTls, TakesAResponseThatDrips) {
  const ServiceClient client("", RunningService().FaultUrl("drip-1"));
  EXPECT_EQ(DescribeFields(*client->AcquireToken(ALICE, PASSWORD, SpecFor(3600))), Describe({}));
}

TEST(AcquireTokenOverTls, LeavesItToTheCallerToJudgeAudienceAndConfirmation) {
  ExpectedFields elsewhere;
  elsewhere.audience = {"https://elsewhere.example/"};
  const ServiceClient wrongAudience("", RunningService().FaultUrl("wrong-audience"));
  EXPECT_EQ(DescribeFields(*wrongAudience->AcquireToken(ALICE, PASSWORD, SpecFor(3600))), Describe(elsewhere));
  const ServiceClient bearer("client", RunningService().FaultUrl("bearer-for-hok"));
  EXPECT_EQ(DescribeFields(*bearer->AcquireToken(ALICE, PASSWORD, SpecFor(3600))), Describe({}));
}

} // namespace
} // namespace SsoClient
