// SPDX-License-Identifier: Apache-2.0
// The events of operations over TLS: every operation, every wrong answer, and services that cannot be reached.
#include "integration/service/service_client.h"
#include "integration/service/wrong_answers.h"
#include "support/recorded_events.h"
#include "support/unavailable_port.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/gss_negotiation_context.h>

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;
using Texts = std::vector<std::string>;

const char ISSUE[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue";
const char RENEW[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Renew";
const char VALIDATE[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Validate";

/// A service with an observer, and the TLS context that it needs.
class ObservedClient {
public:
  explicit ObservedClient(const std::string &url = RunningService().GetUrl(), bool trustsAuthority = true)
      : m_context(trustsAuthority ? TrustingContext() : Tarvel::Ssl::CreateSSLContext()),
        m_service(CreateSecurityTokenService(ConfigFor(*m_context, "client", url), m_observer)) {}

  const SecurityTokenService *operator->() const { return m_service.get(); }
  Texts Lines() const { return m_observer->Lines(); }
  const RecordedEvents &GetEvents() const { return *m_observer; }

private:
  const std::shared_ptr<RecordedEvents> m_observer = std::make_shared<RecordedEvents>();
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context;
  const std::shared_ptr<const SecurityTokenService> m_service;
};

TokenSpec RenewableSpec() {
  TokenSpec spec = SpecFor(3600);
  spec.renewable = true;
  return spec;
}

Texts Success(const std::string &name, const std::string &action) {
  return {"started " + name, "sent " + action, "received 200 OK, text/xml; charset=utf-8", "ended"};
}

TEST(ObserverOverTls, FollowsEachOperation) {
  const auto held = ServiceClient("client")->AcquireToken(ALICE, PASSWORD, RenewableSpec());
  const struct {
    Texts lines;
    std::function<void(const ObservedClient &)> run;
  } cases[] = {
      {Success("AcquireToken", ISSUE),
       [](const ObservedClient &client) { client->AcquireToken(ALICE, PASSWORD, SpecFor(60)); }},
      {Success("AcquireTokenByCertificate", ISSUE),
       [](const ObservedClient &client) { client->AcquireTokenByCertificate(SpecFor(60)); }},
      {Success("AcquireTokenByToken", ISSUE),
       [&](const ObservedClient &client) { client->AcquireTokenByToken(*held, SpecFor(60)); }},
      {Success("ValidateSubject", VALIDATE), [&](const ObservedClient &client) { client->ValidateSubject(*held); }},
      {Success("RenewToken", RENEW), [&](const ObservedClient &client) { client->RenewToken(*held, 60); }},
  };
  for (const auto &expected : cases) {
    const ObservedClient client;
    expected.run(client);
    EXPECT_EQ(client.Lines(), expected.lines);
    for (const std::size_t octets : client.GetEvents().Octets()) {
      EXPECT_GT(octets, 400u);
    }
    for (const std::int64_t duration : client.GetEvents().Durations()) {
      EXPECT_GT(duration, 0);
    }
  }
}

/// The lines of an acquisition of a token, and the message of its exception.
struct Observed {
  Texts lines;
  std::string message;
};

Observed Acquire(const ObservedClient &client) {
  Observed observed;
  try {
    client->AcquireToken(ALICE, PASSWORD, SpecFor(3600));
  } catch (const SsoException &failure) {
    observed.message = failure.what();
  }
  observed.lines = client.Lines();
  return observed;
}

std::string ClassIn(const WrongAnswer &answer) {
  const std::string_view outcome = answer.outcome;
  return std::string(outcome.substr(0, outcome.find(": ")));
}

TEST(ObserverOverTls, ReportsTheExceptionOfEachWrongAnswer) {
  for (const WrongAnswer &answer : TO_ALL) {
    const Observed observed = Acquire(ObservedClient(RunningService().FaultUrl(answer.fault)));
    const bool isFault = std::string_view(answer.fault).starts_with("soap-fault-");
    ASSERT_EQ(observed.lines.size(), isFault ? 5u : 4u) << answer.fault;
    EXPECT_EQ(observed.lines[2].starts_with("received nothing: "),
              ClassIn(answer) == "CommunicationException" && !std::string_view(answer.fault).starts_with("bad-status"))
        << observed.lines[2];
    EXPECT_EQ(observed.lines[3].starts_with("fault "), isFault) << answer.fault;
    EXPECT_EQ(observed.lines.back(), "ended " + ClassIn(answer) + ": " + observed.message) << answer.fault;
  }
  for (const WrongAnswer &answer : INSTEAD_OF_A_TOKEN) {
    const Observed observed = Acquire(ObservedClient(RunningService().FaultUrl(answer.fault)));
    ASSERT_EQ(observed.lines.size(), 4u) << answer.fault;
    EXPECT_EQ(observed.lines.back(), "ended " + ClassIn(answer) + ": " + observed.message) << answer.fault;
  }
}

TEST(ObserverOverTls, ReportsAFaultWithStatusNamespaceAndText) {
  const Observed observed = Acquire(ObservedClient(RunningService().FaultUrl("soap-fault-FailedCheck")));
  EXPECT_EQ(observed.lines[2], "received 500 Internal Server Error, text/xml; charset=utf-8");
  EXPECT_EQ(observed.lines[3],
            "fault {http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd}FailedCheck "
            "wsse:FailedCheck: a fault was asked for ()");
}

TEST(ObserverOverTls, ReportsAnErrorStatus) {
  const Observed observed = Acquire(ObservedClient(RunningService().FaultUrl("bad-status-404")));
  EXPECT_TRUE(observed.lines[2].starts_with("received 404 Not Found, ")) << observed.lines[2];
}

TEST(ObserverOverTls, ReportsARefusedConnection) {
  const UnusedPort port;
  const Observed observed = Acquire(ObservedClient("https://127.0.0.1:" + std::to_string(port.GetPort()) + "/"));
  EXPECT_EQ(observed.lines,
            (Texts{"started AcquireToken", std::string("sent ") + ISSUE, "received nothing: " + observed.message,
                   "ended CommunicationException: " + observed.message}));
  EXPECT_NE(observed.message.find("refused"), std::string::npos) << observed.message;
}

TEST(ObserverOverTls, ReportsAServerThatIsNotTrusted) {
  const Observed observed = Acquire(ObservedClient(RunningService().GetUrl(), false));
  EXPECT_EQ(observed.lines[2],
            "received nothing: The TLS handshake with localhost failed: the server's certificate was not accepted: "
            "unable to get local issuer certificate (certificate \"CN=localhost,O=corp.example\")");
}

TEST(ObserverOverTls, FollowsALegOfANegotiation) {
  const auto context = TrustingContext();
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const auto negotiation = InternalApi::CreateGssNegotiationContext(ConfigFor(*context, "", RunningService().GetUrl()),
                                                                    SpecFor(3600), options);
  EXPECT_THROW(negotiation->NegotiateToken({1, 2, 3}), SsoException);
  EXPECT_EQ(observer->Lines(),
            (Texts{"started NegotiateToken", std::string("sent ") + ISSUE + ", leg 1",
                   "received 500 Internal Server Error, text/xml; charset=utf-8, leg 1",
                   "fault {http://docs.oasis-open.org/ws-sx/ws-trust/200512}RequestFailed wst:RequestFailed: the "
                   "service was started without a keytab and does not negotiate ()",
                   "ended SsoException: Unexpected SOAP fault: wst:RequestFailed; request failed."}));
}

TEST(RefusedTokenSink, GetsATokenThatTheServiceSigned) {
  for (const WrongAnswer &answer : INSTEAD_OF_A_TOKEN) {
    const auto context = TrustingContext();
    Texts refused;
    ServiceOptions options;
    options.refusedTokenSink = [&](const std::string &xml) { refused.push_back(xml); };
    const auto service =
        CreateSecurityTokenService(ConfigFor(*context, "client", RunningService().FaultUrl(answer.fault)), options);
    EXPECT_THROW(service->AcquireToken(ALICE, PASSWORD, SpecFor(3600)), SsoException);
    ASSERT_EQ(refused.size(), 1u) << answer.fault;
    EXPECT_TRUE(refused.front().starts_with("<saml")) << refused.front().substr(0, 40);
  }
}

TEST(VerifyOptionsOfAService, RefuseATokenForAnotherAudience) {
  const auto context = TrustingContext();
  ServiceOptions options;
  options.verifyOptions.acceptedAudiences = {"https://files.corp.example/"};
  const auto service =
      CreateSecurityTokenService(ConfigFor(*context, "", RunningService().FaultUrl("wrong-audience")), options);
  try {
    service->AcquireToken(ALICE, PASSWORD, SpecFor(3600));
    FAIL() << "the token was accepted";
  } catch (const SsoException &failure) {
    EXPECT_STREQ(failure.what(), "The token is restricted to other audiences: https://elsewhere.example/");
  }
}

} // namespace
} // namespace SsoClient
