// SPDX-License-Identifier: Apache-2.0
// The events of each operation: success, fault, a transport that fails, a response of another form, a refused token.
#include "unit/observed_service/observed_operations.h"

#include "support/fixed_environment.h"
#include "support/process_resources.h"
#include "support/recorded_log.h"
#include "support/rendezvous.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <atomic>
#include <stdexcept>

namespace SsoClient {
namespace {

using namespace Testing;
using Texts = std::vector<std::string>;

class EachObservedOperation : public testing::TestWithParam<ObservedOperation> {
protected:
  /// The events of an operation with this response. The outcome of the operation does not matter here.
  Texts LinesFor(const Answer &answer) const {
    const auto observer = std::make_shared<RecordedEvents>();
    ServiceOptions options;
    options.observer = observer;
    try {
      GetParam().run(*ObservedService(answer, options));
    } catch (const Tarvel::Exception &) { // the last line reports it; NOLINT(bugprone-empty-catch)
    }
    return observer->Lines();
  }

  Texts LinesFor(const std::string &response) const {
    return LinesFor([&](const Request &) { return response; });
  }

  Texts Lines(const std::string &received, const Texts &rest) const {
    Texts lines = {std::string("started ") + GetParam().name, "sent " + (GetParam().action + GetParam().leg),
                   "received " + received + GetParam().leg};
    lines.insert(lines.end(), rest.begin(), rest.end());
    return lines;
  }
};

TEST_P(EachObservedOperation, ReportsItsExchangeAndItsSuccess) {
  EXPECT_EQ(LinesFor(GetParam().respond(ReadDataFile("tokens/bearer.xml"))), Lines("200 OK, text/xml", {"ended"}));
}

TEST_P(EachObservedOperation, ReportsAFaultWithItsResolvedName) {
  EXPECT_EQ(LinesFor(Envelope("<soapenv:Fault><faultcode xmlns:ns1='urn:other'>ns1:BadRequest</faultcode>"
                              "<faultstring>An unknown element</faultstring><detail><a>line 7</a></detail>"
                              "</soapenv:Fault>")),
            Lines("200 OK, text/xml", {"fault {urn:other}BadRequest ns1:BadRequest: An unknown element (line 7)",
                                       "ended SsoException: Unexpected SOAP fault: ns1:BadRequest; request failed."}));
}

TEST_P(EachObservedOperation, ReportsATransportThatFails) {
  EXPECT_EQ(LinesFor([](const Request &) -> std::string { throw CommunicationException("gone"); }),
            Lines("nothing: gone", {"ended CommunicationException: gone"}));
}

TEST_P(EachObservedOperation, ReportsAResponseThatIsNotXml) {
  EXPECT_EQ(LinesFor("no XML"),
            Lines("200 OK, text/xml", {"ended SsoException: Response is not well-formed XML: text comes before the "
                                       "document element at line 1, column 1"}));
}

TEST_P(EachObservedOperation, ReportsTheIdentifierOfTheLog) {
  const FixedEnvironment environment;
  const RecordedLog log;
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  EXPECT_THROW(
      GetParam().run(*ObservedService([](const Request &) { return FaultResponse("wst:BadRequest", ""); }, options)),
      SsoException);
  const auto events = observer->LinesById();
  ASSERT_EQ(events.size(), 1u);
  EXPECT_EQ(log.Lines().front(), "SsoClient 64 opId=" + events.begin()->first +
                                     " START operation SecurityTokenServiceImpl::" + GetParam().name);
}

TEST_P(EachObservedOperation, ReportsTheLengthsOfTheBodies) {
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const std::string response = GetParam().respond(ReadDataFile("tokens/bearer.xml"));
  std::size_t sent = 0;
  GetParam().run(*ObservedService(
      [&](const Request &request) {
        sent = request.body.size();
        return response;
      },
      options));
  EXPECT_EQ(observer->Octets(), (std::vector<std::size_t>{sent, response.size()}));
}

INSTANTIATE_TEST_SUITE_P(Service, EachObservedOperation, testing::ValuesIn(ObservedOperations()),
                         [](const auto &operation) { return std::string(operation.param.name); });

class EachObservedTokenOperation : public EachObservedOperation {};

TEST_P(EachObservedTokenOperation, ReportsARefusedToken) {
  EXPECT_EQ(LinesFor(GetParam().respond(ReadDataFile("tokens/signed-by-other.xml"))),
            Lines("200 OK, text/xml", {"ended InvalidSignatureException: Failed to verify signature: token might have "
                                       "been tampered with."}));
  EXPECT_EQ(LinesFor(GetParam().respond(ReadDataFile("tokens/expired.xml"))),
            Lines("200 OK, text/xml", {"ended SsoException: The token has expired at: 2021-01-01T00:00:00.000Z"}));
}

TEST_P(EachObservedTokenOperation, PassesARefusedTokenToTheSinkBeforeItThrows) {
  for (const char *name : {"signed-by-other", "expired"}) {
    Texts refused;
    ServiceOptions options;
    options.refusedTokenSink = [&](const std::string &xml) { refused.push_back(xml); };
    const std::string token = ReadDataFile(std::string("tokens/") + name + ".xml");
    EXPECT_THROW(GetParam().run(*ObservedService([&](const Request &) { return GetParam().respond(token); }, options)),
                 SsoException);
    // The text is the canonical form of the assertion, which is the form that is verified.
    ASSERT_EQ(refused.size(), 1u);
    EXPECT_THROW(CreateSamlToken(refused.front(), TrustedCertificates()), InvalidTokenException);
    EXPECT_NE(refused.front().find("Assertion "), std::string::npos);
  }
}

TEST_P(EachObservedTokenOperation, PassesNothingElseToTheSink) {
  const std::string token = ReadDataFile("tokens/bearer.xml");
  ServiceOptions options;
  options.refusedTokenSink = [](const std::string &) { FAIL(); };
  GetParam().run(*ObservedService([&](const Request &) { return GetParam().respond(token); }, options));
  EXPECT_THROW(GetParam().run(*ObservedService([&](const Request &) { return "no XML"; }, options)), SsoException);
}

TEST_P(EachObservedTokenOperation, LogsWhatTheSinkThrowsWithoutTheTokenAndKeepsTheException) {
  const FixedEnvironment environment;
  const ScopedLogLevel level(8);
  const RecordedLog log;
  ServiceOptions options;
  options.refusedTokenSink = [](const std::string &xml) { throw std::runtime_error("no space for " + xml); };
  const std::string token = ReadDataFile("tokens/signed-by-other.xml");
  EXPECT_THROWS_MESSAGE(
      GetParam().run(*ObservedService([&](const Request &) { return GetParam().respond(token); }, options)),
      InvalidSignatureException, "Failed to verify signature: token might have been tampered with.");
  EXPECT_EQ(log.Lines(), Texts{"SsoClient 8 opId=00000000-0000-4000-8000-000000000001 The sink of refused tokens threw "
                               "runtime_error: no space for ***"});
}

std::vector<ObservedOperation> TokenOperations() {
  std::vector<ObservedOperation> operations = ObservedOperations();
  operations.erase(operations.begin() + 4); // ValidateSubject
  return operations;
}

INSTANTIATE_TEST_SUITE_P(Service, EachObservedTokenOperation, testing::ValuesIn(TokenOperations()),
                         [](const auto &operation) { return std::string(operation.param.name); });

TEST(RefusedTokenSink, GetsATextThatIsNotXml) {
  std::string refused;
  ServiceOptions options;
  options.refusedTokenSink = [&](const std::string &xml) { refused = xml; };
  const SecurityTokenServiceImpl service(
      std::make_shared<const RequestBuilderStandIn>(),
      std::make_shared<TransportStandIn>([](const Request &) { return "issued:no XML"; }),
      std::make_shared<const ResponseHandlerStandIn>(), TrustedCertificates(), options);
  EXPECT_THROW(service.AcquireTokenByCertificate(SpecFor(60)), Tarvel::Xml::XMLParseException);
  EXPECT_EQ(refused, "no XML");
}

TEST(ObservedOperation, ReportsOnlyStartAndEndWhenTheRequestCannotBeBuilt) {
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  EXPECT_THROW(ObservedService([](const Request &) { return ""; }, options)->AcquireToken("a", "secret", SpecFor(0)),
               Tarvel::InvalidArgumentException);
  EXPECT_EQ(observer->Lines(),
            (Texts{"started AcquireToken",
                   "ended InvalidArgumentException: Invalid argument : Token lifetime must be positive"}));
}

TEST(ObservedOperation, ReportsAResponseWithoutTokenAsSuccess) {
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const SecurityTokenServiceImpl service(std::make_shared<const RequestBuilderStandIn>(),
                                         std::make_shared<TransportStandIn>([](const Request &) { return "issued:"; }),
                                         std::make_shared<const ResponseHandlerStandIn>(), {}, options);
  EXPECT_EQ(service.AcquireTokenByCertificate(SpecFor(60)), nullptr);
  EXPECT_EQ(observer->Lines().back(), "ended");
}

/// The lines of a negotiation with this handler and these responses of the service.
Texts LinesOfNegotiation(NegotiationHandler &handler, const Texts &responses) {
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  std::size_t next = 0;
  try {
    ObservedService([&](const Request &) { return responses.at(next++); }, options)
        ->AcquireTokenByGSS(SpecFor(60), handler);
  } catch (...) { // the last line reports it; NOLINT(bugprone-empty-catch)
  }
  return observer->Lines();
}

TEST(ObservedNegotiation, ReportsEachLeg) {
  NegotiationHandlerStandIn handler({Leg("c1"), Leg("c2"), Leg("")});
  EXPECT_EQ(LinesOfNegotiation(
                handler, {IntermediateLeg("ctx", "AQID"), FinalLeg("ctx", "BAUG", ReadDataFile("tokens/bearer.xml"))}),
            (Texts{"started AcquireTokenByGSS", std::string("sent ") + Request::ISSUE + ", leg 1",
                   "received 200 OK, text/xml, leg 1", std::string("sent ") + Request::CHALLANGE + ", leg 2",
                   "received 200 OK, text/xml, leg 2", "ended"}));
}

TEST(ObservedNegotiation, ReportsTheClassOfAnExceptionOfTheHandler) {
  struct ForeignFailure {};
  class Handler final : public NegotiationHandler {
  public:
    std::shared_ptr<Bytes> NegotiateLeg(const Bytes &) override { throw ForeignFailure(); }
  } handler;
  EXPECT_EQ(LinesOfNegotiation(handler, {}), (Texts{"started AcquireTokenByGSS", "ended ForeignFailure: "}));
}

// An asynchronous operation that throws a foreign class does not call its completion, but it reports its end.
TEST(ObservedAsyncOperation, ReportsItsEndAlsoForAnExceptionOfAForeignClass) {
  class Handler final : public NegotiationHandler {
  public:
    std::shared_ptr<Bytes> NegotiateLeg(const Bytes &) override { throw 7; }
  };
  class EndObserver final : public OperationObserver {
  public:
    void OnEnded(const OperationInfo &, const OperationEndedEvent &event) override {
      className = event.exceptionClass;
      ended.Add();
    }
    std::string className;
    EventCount ended;
  };
  const RecordedLog log;
  const auto observer = std::make_shared<EndObserver>();
  ServiceOptions options;
  options.observer = observer;
  ObservedService([](const Request &) { return ""; }, options)
      ->AcquireTokenByGssAsync(SpecFor(60), std::make_shared<Handler>(),
                               [](const std::shared_ptr<const SamlToken> &, const Tarvel::Exception *) { FAIL(); });
  ASSERT_TRUE(observer->ended.WaitFor(1));
  EXPECT_EQ(observer->className, "int");
  // The last line of the thread: it would otherwise be in the log of the next test.
  const std::string last =
      "Tarvel 8 An exception left a work item of the thread pool: an object that is not a std::exception";
  EXPECT_TRUE(Eventually([&] { return !log.Lines().empty() && log.Lines().back() == last; }));
}

TEST(ObservedAsyncOperation, ReportsTheEventsOfEachOperationInOrderWhenManyRunAtOnce) {
  constexpr int COUNT = 100;
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const std::string token = ReadDataFile("tokens/bearer.xml");
  const auto service = ObservedService([&](const Request &) { return IssueResponse(token); }, options);
  EventCount completed;
  for (int i = 0; i < COUNT; ++i) {
    service->AcquireTokenAsync(
        "alice", CANARY_PASSWORD, SpecFor(60),
        [&](const std::shared_ptr<const SamlToken> &, const Tarvel::Exception *) { completed.Add(); });
  }
  ASSERT_TRUE(completed.WaitFor(COUNT));
  const auto events = observer->LinesById();
  EXPECT_EQ(events.size(), static_cast<std::size_t>(COUNT));
  for (const auto &[id, lines] : events) {
    EXPECT_EQ(lines, (Texts{"started AcquireToken", std::string("sent ") + Request::ISSUE, "received 200 OK, text/xml",
                            "ended"}));
  }
}

TEST(CreateSecurityTokenService, AcceptsAnObserverOrNull) {
  SecurityTokenServiceConfig config;
  config.stsUrl = "http://127.0.0.1:1/";
  const auto observer = std::make_shared<RecordedEvents>();
  EXPECT_THROW(CreateSecurityTokenService(config, observer)->AcquireToken("a", "b", SpecFor(0)), Tarvel::Exception);
  EXPECT_EQ(observer->Lines().size(), 2u);
  const std::shared_ptr<OperationObserver> none;
  EXPECT_THROW(CreateSecurityTokenService(config, none)->AcquireToken("a", "b", SpecFor(0)), Tarvel::Exception);
}

TEST(SecurityTokenServiceImpl, VerifiesReturnedTokensWithItsOptions) {
  ServiceOptions options;
  const std::string token = ReadDataFile("tokens/expired.xml");
  const auto answer = [&](const Request &) { return IssueResponse(token); };
  EXPECT_THROWS_MESSAGE(ObservedService(answer, options)->AcquireTokenByCertificate(SpecFor(60)), SsoException,
                        "The token has expired at: 2021-01-01T00:00:00.000Z");
  options.verifyOptions.clockToleranceSec = std::int64_t{100} * 365 * 24 * 3600;
  EXPECT_NE(ObservedService(answer, options)->AcquireTokenByCertificate(SpecFor(60)), nullptr);
}

} // namespace
} // namespace SsoClient
