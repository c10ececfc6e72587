// SPDX-License-Identifier: Apache-2.0

#include "gss/gss_negotiation_context_impl.h"

#include "support/data_file.h"
#include "support/recorded_events.h"
#include "support/recorded_log.h"
#include "support/service_stand_ins.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

namespace SsoClient::InternalApi {
namespace {

using Testing::Bytes;
using Testing::ToBytes;
using Texts = std::vector<std::string>;

std::string Token(const std::string &name) {
  return Testing::ReadDataFile("tokens/" + name + ".xml");
}

/// A context whose service answers each leg with the next of the given responses.
class GssNegotiation {
public:
  explicit GssNegotiation(Texts answers, const ServiceOptions &options = {})
      : m_transport(std::make_shared<Testing::TransportStandIn>(
            [answers, next = std::make_shared<std::size_t>(0)](const Request &) { return answers.at((*next)++); })),
        m_context(std::make_shared<GssNegotiationContextImpl>(
            Testing::SpecFor(60), std::make_shared<const Testing::RequestBuilderStandIn>(),
            m_transport->CreateSession(), std::make_shared<const Testing::ResponseHandlerStandIn>(),
            Testing::TrustedCertificates(), options)) {}

  GssNegotiationResult Negotiate(const std::string &leg) const { return m_context->NegotiateToken(ToBytes(leg)); }
  Texts Sent() const { return m_transport->Sent(); }
  int CountSessions() const { return m_transport->CountSessions(); }

private:
  const std::shared_ptr<Testing::TransportStandIn> m_transport;
  const std::shared_ptr<GssNegotiationContext> m_context;
};

TEST(GssNegotiationContext, StartsWithAnInitialLegAndContinuesInTheContextThatTheServiceReturnedLast) {
  const GssNegotiation negotiation({"leg:ctx1|s1|", "leg:ctx2|s2|", "leg:ctx2||" + Token("bearer")});
  const GssNegotiationResult first = negotiation.Negotiate("c1");
  EXPECT_EQ(*first.serverLeg, ToBytes("s1"));
  EXPECT_EQ(first.token, nullptr);
  EXPECT_EQ(*negotiation.Negotiate("c2").serverLeg, ToBytes("s2"));
  EXPECT_NE(negotiation.Negotiate("c3").token, nullptr);
  EXPECT_EQ(negotiation.Sent(),
            (Texts{"1: InitialSPNego 60 c1", "1: ContinuedSPNego ctx1 c2", "1: ContinuedSPNego ctx2 c3"}));
  EXPECT_EQ(negotiation.CountSessions(), 1);
}

TEST(GssNegotiationContext, ReturnsFinalServiceLegAndTokenInOneResult) {
  const GssNegotiationResult result = GssNegotiation({"leg:ctx|final|" + Token("bearer")}).Negotiate("c1");
  EXPECT_EQ(*result.serverLeg, ToBytes("final"));
  ASSERT_NE(result.token, nullptr);
  EXPECT_EQ(result.token->ToXml(), Token("bearer"));
}

TEST(GssNegotiationContext, StartsAgainWhenTheServiceReturnedNoContext) {
  const GssNegotiation negotiation({"leg:|s1|", "leg:ctx|s2|", "leg:|s3|", "leg:ctx|s4|"});
  for (const char *leg : {"c1", "c2", "c3", "c4"}) {
    negotiation.Negotiate(leg);
  }
  EXPECT_EQ(negotiation.Sent(), (Texts{"1: InitialSPNego 60 c1", "1: InitialSPNego 60 c2", "1: ContinuedSPNego ctx c3",
                                       "1: InitialSPNego 60 c4"}));
}

TEST(GssNegotiationContext, ReturnsANewListForEachLegAndAnEmptyOneWhenTheServiceSentNone) {
  const GssNegotiation negotiation({"leg:ctx||", "leg:ctx||"});
  const GssNegotiationResult first = negotiation.Negotiate("");
  const GssNegotiationResult second = negotiation.Negotiate("");
  ASSERT_NE(first.serverLeg, nullptr);
  EXPECT_EQ(*first.serverLeg, Bytes());
  EXPECT_NE(first.serverLeg, second.serverLeg);
}

TEST(GssNegotiationContext, ContinuesAfterTheTokenInTheLastContext) {
  const GssNegotiation negotiation({"leg:ctx||" + Token("bearer"), "leg:ctx|s2|"});
  negotiation.Negotiate("c1");
  negotiation.Negotiate("c2");
  EXPECT_EQ(negotiation.Sent(), (Texts{"1: InitialSPNego 60 c1", "1: ContinuedSPNego ctx c2"}));
}

TEST(GssNegotiationContext, StaysInTheContextOfTheLastAnsweredLegWhenALegFails) {
  const GssNegotiation negotiation({"fault:busy", "leg:ctx|s2|", "fault:busy", "leg:ctx|s4|"});
  EXPECT_THROWS_MESSAGE(negotiation.Negotiate("c1"), InvalidCredentialsException, "busy");
  negotiation.Negotiate("c2");
  EXPECT_THROWS_MESSAGE(negotiation.Negotiate("c3"), InvalidCredentialsException, "busy");
  negotiation.Negotiate("c4");
  EXPECT_EQ(negotiation.Sent(), (Texts{"1: InitialSPNego 60 c1", "1: InitialSPNego 60 c2", "1: ContinuedSPNego ctx c3",
                                       "1: ContinuedSPNego ctx c4"}));
}

TEST(GssNegotiationContext, PassesOnAParseExceptionOfTheTokenAndKeepsTheContext) {
  const GssNegotiation negotiation({"leg:ctx||" + Token("expired"), "leg:ctx|s2|"});
  EXPECT_THROWS_MESSAGE(negotiation.Negotiate("c1"), ParseException,
                        "The token has expired at: 2021-01-01T00:00:00.000Z");
  negotiation.Negotiate("c2");
  EXPECT_EQ(negotiation.Sent(), (Texts{"1: InitialSPNego 60 c1", "1: ContinuedSPNego ctx c2"}));
}

TEST(GssNegotiationContext, PassesOnTheExceptionOfAWrongSignature) {
  EXPECT_THROWS_MESSAGE(GssNegotiation({"leg:ctx||" + Token("signed-by-other")}).Negotiate("c1"),
                        InvalidSignatureException, "Failed to verify signature: token might have been tampered with.");
}

TEST(GssNegotiationContext, WritesNoLogLine) {
  const Testing::RecordedLog log;
  GssNegotiation({"leg:ctx|final|" + Token("bearer")}).Negotiate("c1");
  EXPECT_EQ(log.Lines(), Texts{});
}

TEST(GssNegotiationContext, ReportsEachLegAsOneOperation) {
  const auto observer = std::make_shared<Testing::RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const GssNegotiation negotiation({"leg:ctx|s1|", "fault:busy", "leg:ctx|s2|" + Token("bearer")}, options);
  negotiation.Negotiate("c1");
  EXPECT_THROWS_MESSAGE(negotiation.Negotiate("c2"), InvalidCredentialsException, "busy");
  negotiation.Negotiate("c2");
  EXPECT_EQ(observer->Lines(),
            (Texts{"started NegotiateToken", "sent urn:action, leg 1", "received 200 OK, text/xml, leg 1", "ended",
                   "started NegotiateToken", "sent urn:action, leg 2", "received 200 OK, text/xml, leg 2",
                   "ended InvalidCredentialsException: busy", //
                   "started NegotiateToken", "sent urn:action, leg 2", "received 200 OK, text/xml, leg 2", "ended"}));
  EXPECT_EQ(observer->LinesById().size(), 3u);
}

TEST(GssNegotiationContext, MasksALegThatTheServiceRepeats) {
  const auto observer = std::make_shared<Testing::RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const GssNegotiation negotiation({"fault:no Y2xpZW50LWxlZw=="}, options);
  EXPECT_THROW(negotiation.Negotiate("client-leg"), InvalidCredentialsException);
  EXPECT_EQ(observer->Lines().back(), "ended InvalidCredentialsException: no ***");
}

TEST(GssNegotiationContext, MasksTheLegsOfEarlierCalls) {
  const auto observer = std::make_shared<Testing::RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const GssNegotiation negotiation({"leg:ctx|service-leg|", "fault:no Y2xpZW50LWxlZw== or c2VydmljZS1sZWc="}, options);
  negotiation.Negotiate("client-leg");
  EXPECT_THROW(negotiation.Negotiate("another-leg"), InvalidCredentialsException);
  EXPECT_EQ(observer->Lines().back(), "ended InvalidCredentialsException: no *** or ***");
}

TEST(GssNegotiationContext, PassesARefusedTokenToTheSink) {
  Texts refused;
  ServiceOptions options;
  options.refusedTokenSink = [&](const std::string &xml) { refused.push_back(xml); };
  EXPECT_THROW(GssNegotiation({"leg:ctx||" + Token("expired")}, options).Negotiate("c1"), ParseException);
  EXPECT_EQ(refused, Texts{Token("expired")});
}

TEST(GssNegotiationContext, LogsWhatTheSinkThrows) {
  const Testing::RecordedLog log;
  ServiceOptions options;
  options.refusedTokenSink = [](const std::string &) { throw 7; };
  EXPECT_THROWS_MESSAGE(GssNegotiation({"leg:ctx||" + Token("expired")}, options).Negotiate("c1"), ParseException,
                        "The token has expired at: 2021-01-01T00:00:00.000Z");
  EXPECT_EQ(log.Lines(), Texts{"SsoClient 8 The sink of refused tokens threw int"});
}

TEST(GssNegotiationContext, VerifiesTheTokenWithItsOptions) {
  ServiceOptions options;
  options.verifyOptions.clockToleranceSec = std::int64_t{100} * 365 * 24 * 3600;
  EXPECT_NE(GssNegotiation({"leg:ctx||" + Token("expired")}, options).Negotiate("c1").token, nullptr);
}

TEST(GssNegotiationContext, CannotBeMadeWithoutTrustedCertificates) {
  const Testing::TransportStandIn transport([](const Request &) { return std::string(); });
  EXPECT_THROWS_MESSAGE(GssNegotiationContextImpl(
                            Testing::SpecFor(60), std::make_shared<const Testing::RequestBuilderStandIn>(),
                            transport.CreateSession(), std::make_shared<const Testing::ResponseHandlerStandIn>(), {}),
                        Tarvel::InvalidArgumentException, "Invalid argument : No STS trusted certificates provided");
}

} // namespace
} // namespace SsoClient::InternalApi
