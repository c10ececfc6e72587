// SPDX-License-Identifier: Apache-2.0

#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/recorded_log.h"
#include "support/service_stand_ins.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::Bytes;
using Testing::Leg;
using Testing::NegotiationHandlerStandIn;
using Testing::RecordedLog;
using Testing::SpecFor;
using Testing::TransportStandIn;
using Texts = std::vector<std::string>;

std::string IssuedToken() {
  return Testing::ReadDataFile("tokens/bearer-minimal.xml");
}

/// A service that answers each leg with the next of the given responses.
class GssAcquisition {
public:
  explicit GssAcquisition(Texts answers)
      : transport(std::make_shared<TransportStandIn>(
            [answers, next = std::make_shared<std::size_t>(0)](const Request &) { return answers.at((*next)++); })),
        m_service(Testing::ServiceOn(transport)) {}

  std::shared_ptr<const SamlToken> Acquire(NegotiationHandler &handler) const {
    return m_service->AcquireTokenByGSS(SpecFor(60), handler);
  }

  const std::shared_ptr<TransportStandIn> transport;

private:
  const std::shared_ptr<SecurityTokenServiceImpl> m_service;
};

const Texts START_AND_END = {
    "SsoClient 64 opId=00000000-0000-4000-8000-000000000001 START operation "
    "SecurityTokenServiceImpl::AcquireTokenByGSS",
    "SsoClient 64 Requested token with spec `TokenSpec [tokenLifetimeSec=60, delegable=false, delegateTo=<unset>, "
    "renewable=false, confirmationType=0,audienceRestriction=, advice=[]'",
    "SsoClient 64 opId=00000000-0000-4000-8000-000000000001 END operation SecurityTokenServiceImpl::AcquireTokenByGSS"};

const char ACQUIRED[] =
    "SsoClient 64 Successfully acquired token: SamlToken [subject={Name: alice; Domain:corp.example}, groups=[], "
    "delegationChain=[], startTime=2020-01-01T00:00:00.000Z, expirationTime=2120-01-01T00:00:00.000Z, "
    "renewable=false, delegable=false, isSolution=false,confirmationType=0]";

const char CONTRACT_WARNING[] = "SsoClient 8 GSS contract error: non-empty user leg after negotiation is complete";

TEST(AcquireTokenByGss, SendsAllLegsInOneSession) {
  const GssAcquisition acquisition({"leg:ctx1|s1|", "leg:ctx2|s2|", "leg:ctx3||" + IssuedToken()});
  NegotiationHandlerStandIn handler({Leg("c1"), Leg("c2"), Leg("c3")});
  const auto token = acquisition.Acquire(handler);
  ASSERT_NE(token, nullptr);
  EXPECT_EQ(token->ToXml(), IssuedToken());
  EXPECT_EQ(acquisition.transport->Sent(),
            (Texts{"1: InitialSPNego 60 c1", "1: ContinuedSPNego ctx1 c2", "1: ContinuedSPNego ctx2 c3"}));
  EXPECT_EQ(handler.received, (Texts{"", "s1", "s2"}));
  EXPECT_EQ(acquisition.transport->CountSessions(), 1);
  EXPECT_EQ(acquisition.transport->CountOpenSessions(), 0);
}

/// Records the number of sessions at each call.
class SessionCountingHandler final : public NegotiationHandler {
public:
  explicit SessionCountingHandler(const TransportStandIn &transport) : m_transport(transport) {}

  std::shared_ptr<Bytes> NegotiateLeg(const Bytes &) override {
    sessions.push_back(m_transport.CountSessions());
    return Leg("c");
  }

  std::vector<int> sessions;

private:
  const TransportStandIn &m_transport;
};

TEST(AcquireTokenByGss, CreatesItsSessionBeforeItAsksForTheFirstLeg) {
  const GssAcquisition acquisition({"leg:ctx|s1|", "leg:ctx||" + IssuedToken()});
  SessionCountingHandler handler(*acquisition.transport);
  acquisition.Acquire(handler);
  EXPECT_EQ(handler.sessions, (std::vector<int>{1, 1}));
}

TEST(AcquireTokenByGss, SendsNothingWhenTheFirstLegIsNullButLogsTheEnd) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  const GssAcquisition acquisition({});
  NegotiationHandlerStandIn handler({nullptr});
  EXPECT_THROWS_MESSAGE(acquisition.Acquire(handler), Tarvel::InvalidArgumentException,
                        "Invalid argument : Invalid NegotiationHandler: the returned leg may not be NULL");
  EXPECT_EQ(acquisition.transport->Sent(), Texts{});
  EXPECT_EQ(log.Lines(), START_AND_END);
}

TEST(AcquireTokenByGss, RefusesANullLegInTheMiddle) {
  const GssAcquisition acquisition({"leg:ctx|s1|"});
  NegotiationHandlerStandIn handler({Leg("c1"), nullptr});
  EXPECT_THROWS_MESSAGE(acquisition.Acquire(handler), Tarvel::InvalidArgumentException,
                        "Invalid argument : Invalid NegotiationHandler: the returned leg may not be NULL");
  EXPECT_EQ(acquisition.transport->CountOpenSessions(), 0);
}

TEST(AcquireTokenByGss, SendsAnEmptyLegUnchanged) {
  const GssAcquisition acquisition({"leg:ctx|s1|", "leg:ctx||" + IssuedToken()});
  NegotiationHandlerStandIn handler({Leg(""), Leg("")});
  EXPECT_NE(acquisition.Acquire(handler), nullptr);
  EXPECT_EQ(acquisition.transport->Sent(), (Texts{"1: InitialSPNego 60 ", "1: ContinuedSPNego ctx "}));
}

TEST(AcquireTokenByGss, RefusesAFirstResponseWithoutContextIdEvenIfItHasAToken) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  const GssAcquisition acquisition({"leg:|s1|" + IssuedToken()});
  NegotiationHandlerStandIn handler({Leg("c1")});
  EXPECT_THROWS_MESSAGE(acquisition.Acquire(handler), CommunicationException,
                        "Error processing the response to SPNego token request: no Context ID was returned.");
  EXPECT_EQ(log.Lines(), START_AND_END);
}

TEST(AcquireTokenByGss, RefusesALaterResponseWithoutContextId) {
  const GssAcquisition acquisition({"leg:ctx|s1|", "leg:|s2|"});
  NegotiationHandlerStandIn handler({Leg("c1"), Leg("c2")});
  EXPECT_THROWS_MESSAGE(acquisition.Acquire(handler), CommunicationException,
                        "Error processing the response to SPNego token request: no Context ID was returned.");
}

TEST(AcquireTokenByGss, DoesNotCallTheHandlerAgainWhenTheFinalServiceLegIsEmpty) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  const GssAcquisition acquisition({"leg:ctx||" + IssuedToken()});
  NegotiationHandlerStandIn handler({Leg("c1")});
  acquisition.Acquire(handler);
  EXPECT_EQ(handler.received, Texts{""});
  EXPECT_EQ(log.Lines(), (Texts{START_AND_END[0], START_AND_END[1], ACQUIRED, START_AND_END[2]}));
}

struct FinalAnswer {
  const char *name;
  std::shared_ptr<Bytes> leg;
  bool isWarnedOf;
};

class AcquireTokenByGssFinalLeg : public testing::TestWithParam<FinalAnswer> {};

TEST_P(AcquireTokenByGssFinalLeg, IsPassedToTheHandlerWhoseAnswerIsNeverSent) {
  const Testing::FixedEnvironment environment;
  const RecordedLog log;
  const GssAcquisition acquisition({"leg:ctx|final|" + IssuedToken()});
  NegotiationHandlerStandIn handler({Leg("c1"), GetParam().leg});
  EXPECT_NE(acquisition.Acquire(handler), nullptr);
  EXPECT_EQ(handler.received, (Texts{"", "final"}));
  EXPECT_EQ(acquisition.transport->Sent(), Texts{"1: InitialSPNego 60 c1"});
  Texts lines = {START_AND_END[0], START_AND_END[1]};
  if (GetParam().isWarnedOf) {
    lines.push_back(CONTRACT_WARNING);
  }
  lines.insert(lines.end(), {ACQUIRED, START_AND_END[2]});
  EXPECT_EQ(log.Lines(), lines);
}

INSTANTIATE_TEST_SUITE_P(WarnsWhenTheAnswerIsNullOrEmpty, AcquireTokenByGssFinalLeg,
                         testing::Values(FinalAnswer{"Null", nullptr, true}, FinalAnswer{"Empty", Leg(""), true},
                                         FinalAnswer{"NonEmpty", Leg("x"), false}),
                         [](const auto &answer) { return std::string(answer.param.name); });

TEST(AcquireTokenByGss, WarnsOfABrokenContractAtLevelEightAndNotBelow) {
  for (const int level : {8, 7}) {
    const Testing::ScopedLogLevel scope(level);
    const RecordedLog log;
    const GssAcquisition acquisition({"leg:ctx|final|" + IssuedToken()});
    NegotiationHandlerStandIn handler({Leg("c1"), nullptr});
    acquisition.Acquire(handler);
    EXPECT_EQ(log.Lines(), level == 8 ? Texts{CONTRACT_WARNING} : Texts{});
  }
}

TEST(AcquireTokenByGss, PassesOnAnExceptionOfTheHandler) {
  class ThrowingHandler final : public NegotiationHandler {
    std::shared_ptr<Bytes> NegotiateLeg(const Bytes &) override { throw std::range_error("no ticket"); }
  } handler;
  const GssAcquisition acquisition({});
  EXPECT_THROWS_MESSAGE(acquisition.Acquire(handler), std::range_error, "no ticket");
  EXPECT_EQ(acquisition.transport->CountOpenSessions(), 0);
}

TEST(AcquireTokenByGss, HasNoLimitOnTheNumberOfLegs) {
  constexpr std::size_t LEGS = 1000;
  Texts answers(LEGS, "leg:ctx|s|");
  answers.push_back("leg:ctx||" + IssuedToken());
  const GssAcquisition acquisition(answers);
  NegotiationHandlerStandIn handler(std::vector<std::shared_ptr<Bytes>>(LEGS + 1, Leg("c")));
  EXPECT_NE(acquisition.Acquire(handler), nullptr);
  EXPECT_EQ(handler.received.size(), LEGS + 1);
}

} // namespace
} // namespace SsoClient
