// SPDX-License-Identifier: Apache-2.0
// Compares the whole log of each operation, so that nothing secret can be in it.
#include "support/counting_token.h"
#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/recorded_log.h"
#include "support/service_stand_ins.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::CountingToken;
using Testing::RecordedLog;
using Texts = std::vector<std::string>;

const char SPEC_TEXT[] = "TokenSpec [tokenLifetimeSec=3600, delegable=true, delegateTo=carol@corp.example, "
                         "renewable=true, confirmationType=1,audienceRestriction=https://a.example/, "
                         "advice=[Advice [source=urn:advice, attributes=[[source=size, attributes=[7]]]]]";

const char ACQUIRED[] =
    "Successfully acquired token: SamlToken [subject={Name: alice; Domain:corp.example}, groups=[], "
    "delegationChain=[], startTime=2020-01-01T00:00:00.000Z, expirationTime=2120-01-01T00:00:00.000Z, "
    "renewable=false, delegable=false, isSolution=false,confirmationType=0]";

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  spec.delegable = true;
  spec.delegateTo = std::string("carol@corp.example");
  spec.renewable = true;
  spec.confirmation = TokenSpec::CONFIRMATION_NONE;
  spec.audienceRestriction = {"https://a.example/"};
  spec.advice = {{"urn:advice", {{"size", {"7"}}}}};
  return spec;
}

struct LoggedOperation {
  const char *name;
  const char *response; ///< the text before the token in the response
  bool yieldsToken;
  std::function<void(const SecurityTokenService &, const SamlToken &)> run;
  Texts request; ///< the lines about the request
  Texts result;  ///< the lines about success, without the one about the token
};

void PrintTo(const LoggedOperation &operation, std::ostream *out) {
  *out << operation.name;
}

std::vector<LoggedOperation> LoggedOperations() {
  const std::string spec = SPEC_TEXT;
  const std::string token = Testing::COUNTING_TOKEN_DESCRIPTION;
  return {
      {"AcquireToken",
       "issued:",
       true,
       [](const SecurityTokenService &service, const SamlToken &) {
         service.AcquireToken("alice@corp.example", "secret password", Spec());
       },
       {"Requested token for subject `alice@corp.example', spec `" + spec + "'",
        "SecurityTokenServiceImpl::AcquireToken sending request"},
       {"SecurityTokenServiceImpl::AcquireToken processing response"}},
      {"AcquireTokenByCertificate",
       "issued:",
       true,
       [](const SecurityTokenService &service, const SamlToken &) { service.AcquireTokenByCertificate(Spec()); },
       {"Requested token with spec `" + spec + "'"},
       {}},
      {"AcquireTokenByToken",
       "issued:",
       true,
       [](const SecurityTokenService &service, const SamlToken &held) { service.AcquireTokenByToken(held, Spec()); },
       {"Requested token for " + token + " with spec `" + spec + "'"},
       {}},
      {"AcquireTokenByGSS",
       "leg:context||",
       true,
       [](const SecurityTokenService &service, const SamlToken &) {
         Testing::NegotiationHandlerStandIn handler({Testing::Leg("secret leg")});
         service.AcquireTokenByGSS(Spec(), handler);
       },
       {"Requested token with spec `" + spec + "'"},
       {}},
      {"ValidateSubject",
       "valid:true",
       false,
       [](const SecurityTokenService &service, const SamlToken &held) { service.ValidateSubject(held); },
       {"Validating subject of token " + token},
       {"Result: true"}},
      {"RenewToken",
       "renewed:",
       true,
       [](const SecurityTokenService &service, const SamlToken &held) { service.RenewToken(held, 7200); },
       {"Renewing token " + token + " for 7200 more seconds"},
       {}},
  };
}

Texts FrameOf(const std::string &operation, const std::vector<Texts> &inside) {
  const std::string begin = "SsoClient 64 ";
  const std::string opId = "opId=00000000-0000-4000-8000-000000000001 ";
  Texts lines = {begin + opId + "START operation SecurityTokenServiceImpl::" + operation};
  for (const Texts &texts : inside) {
    for (const std::string &text : texts) {
      lines.push_back(begin + text);
    }
  }
  lines.push_back(begin + opId + "END operation SecurityTokenServiceImpl::" + operation);
  return lines;
}

class OperationLog : public testing::TestWithParam<LoggedOperation> {
protected:
  void Run(const std::string &response) const {
    const auto transport = std::make_shared<Testing::TransportStandIn>([&](const Request &) { return response; });
    GetParam().run(*Testing::ServiceOn(transport), m_token);
  }

  std::string Response() const {
    return GetParam().response + (GetParam().yieldsToken ? Testing::ReadDataFile("tokens/bearer-minimal.xml") : "");
  }

  CountingToken m_token;
};

TEST_P(OperationLog, ContainsStartRequestResultAndEndAndNothingSecret) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  Run(Response());
  EXPECT_EQ(log.Lines(), FrameOf(GetParam().name, {GetParam().request, GetParam().result,
                                                   GetParam().yieldsToken ? Texts{ACQUIRED} : Texts{}}));
  for (const std::string &line : log.Lines()) {
    EXPECT_EQ(line.find("secret"), std::string::npos) << line;
  }
}

TEST_P(OperationLog, ContainsStartRequestAndEndOfAnOperationThatFails) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  EXPECT_THROWS_MESSAGE(Run("fault:refused"), InvalidCredentialsException, "refused");
  const Texts processing = std::string(GetParam().name) == "AcquireToken" ? GetParam().result : Texts{};
  EXPECT_EQ(log.Lines(), FrameOf(GetParam().name, {GetParam().request, processing}));
}

TEST_P(OperationLog, ContainsStartRequestAndEndButNoSendingWhenTheRequestCannotBeBuilt) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  const auto refuse = [] { throw Tarvel::InvalidArgumentException("no such lifetime"); };
  const auto transport = std::make_shared<Testing::TransportStandIn>([](const Request &) { return "issued:"; });
  const SecurityTokenServiceImpl service(std::make_shared<const Testing::RequestBuilderStandIn>(refuse), transport,
                                         std::make_shared<const Testing::ResponseHandlerStandIn>(),
                                         Testing::TrustedCertificates());
  EXPECT_THROWS_MESSAGE(GetParam().run(service, m_token), Tarvel::InvalidArgumentException,
                        "Invalid argument : no such lifetime");
  EXPECT_EQ(log.Lines(), FrameOf(GetParam().name, {{GetParam().request.front()}}));
  EXPECT_EQ(transport->Sent(), Texts{});
  EXPECT_EQ(transport->CountSessions(),
            GetParam().name == std::string("AcquireTokenByGSS") ? 1 : 0); // one for all its legs
  EXPECT_EQ(transport->CountOpenSessions(), 0);
}

TEST_P(OperationLog, ContainsStartRequestAndEndButNoProcessingWhenTheTransportFails) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  const auto transport = std::make_shared<Testing::TransportStandIn>(
      [](const Request &) -> std::string { throw CommunicationException("gone"); });
  EXPECT_THROWS_MESSAGE(GetParam().run(*Testing::ServiceOn(transport), m_token), CommunicationException, "gone");
  EXPECT_EQ(log.Lines(), FrameOf(GetParam().name, {GetParam().request}));
}

TEST_P(OperationLog, ComputesAndWritesNothingBelowLevel64) {
  const Testing::ScopedLogLevel level(63);
  const RecordedLog log;
  Run(Response());
  EXPECT_EQ(log.Lines(), Texts{});
  EXPECT_EQ(m_token.CountCalls(), 0);
}

INSTANTIATE_TEST_SUITE_P(EachOperation, OperationLog, testing::ValuesIn(LoggedOperations()),
                         [](const auto &operation) { return std::string(operation.param.name); });

class OperationLogOfAWrongToken : public OperationLog {};

TEST_P(OperationLogOfAWrongToken, DoesNotReportSuccess) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  EXPECT_THROWS_MESSAGE(Run(GetParam().response + Testing::ReadDataFile("tokens/signed-by-other.xml")),
                        InvalidSignatureException, "Failed to verify signature: token might have been tampered with.");
  EXPECT_EQ(log.Lines(), FrameOf(GetParam().name, {GetParam().request, GetParam().result}));
}

std::vector<LoggedOperation> LoggedTokenOperations() {
  std::vector<LoggedOperation> operations = LoggedOperations();
  operations.erase(std::remove_if(operations.begin(), operations.end(), [](const auto &o) { return !o.yieldsToken; }),
                   operations.end());
  return operations;
}

INSTANTIATE_TEST_SUITE_P(EachTokenOperation, OperationLogOfAWrongToken, testing::ValuesIn(LoggedTokenOperations()),
                         [](const auto &operation) { return std::string(operation.param.name); });

TEST(OperationLogOfAResponseWithoutToken, DoesNotReportSuccess) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  const auto transport = std::make_shared<Testing::TransportStandIn>([](const Request &) { return "issued:"; });
  EXPECT_EQ(Testing::ServiceOn(transport)->AcquireTokenByCertificate(Spec()), nullptr);
  EXPECT_EQ(log.Lines(),
            FrameOf("AcquireTokenByCertificate", {{std::string("Requested token with spec `") + SPEC_TEXT + "'"}}));
}

TEST(OperationLogOfAVerdict, ReportsThatATokenIsNotValid) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  const auto transport = std::make_shared<Testing::TransportStandIn>([](const Request &) { return "valid:false"; });
  EXPECT_FALSE(Testing::ServiceOn(transport)->ValidateSubject(CountingToken()));
  EXPECT_EQ(log.Lines(), FrameOf("ValidateSubject",
                                 {{std::string("Validating subject of token ") + Testing::COUNTING_TOKEN_DESCRIPTION},
                                  {"Result: false"}}));
}

TEST(OperationFrame, GivesEachOperationANewIdentifier) {
  const RecordedLog log;
  const auto transport = std::make_shared<Testing::TransportStandIn>([](const Request &) { return "issued:"; });
  const auto service = Testing::ServiceOn(transport);
  service->AcquireTokenByCertificate(Spec());
  service->AcquireTokenByCertificate(Spec());
  const Texts lines = log.Lines();
  ASSERT_EQ(lines.size(), 6u);
  const auto opId = [](const std::string &line) {
    return line.substr(0, std::string("SsoClient 64 opId=").size() + 36);
  };
  EXPECT_EQ(opId(lines[0]), opId(lines[2]));
  EXPECT_EQ(opId(lines[3]), opId(lines[5]));
  EXPECT_NE(opId(lines[0]), opId(lines[3]));
}

} // namespace
} // namespace SsoClient
