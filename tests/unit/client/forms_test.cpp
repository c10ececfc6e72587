// SPDX-License-Identifier: Apache-2.0
// The forms of each operation, over the real transport and over a scripted one.
#include "client_setup.h"
#include "support/recorded_log.h"
#include "support/rendezvous.h"
#include "support/scripted_server.h"
#include "support/soap_responses.h"

#include <ssoclient/logger.h>

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <future>
#include <memory>
#include <new>
#include <ostream>
#include <set>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using Testing::Alice;
using Testing::ClientOn;
using Testing::EndOf;
using Testing::Outcomes;
using Testing::ScriptedTransport;
using Testing::SpecFor;
using Strings = std::vector<std::string>;

constexpr const char *SUBJECT = "{Name: alice; Domain:corp.example}";

std::string HttpResponse(const std::string &body) {
  return "HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" +
         body;
}

/// A service on loopback, and a client of it.
class LoopbackClient : public testing::Test {
protected:
  std::unique_ptr<TokenClient> ClientOf(const Testing::ScriptedServer &server) {
    SecurityTokenServiceConfig config;
    config.stsUrl = "http://127.0.0.1:" + std::to_string(server.GetPort()) + "/sts";
    config.signingCertificates = Testing::TrustedCertificates();
    return std::make_unique<TokenClient>(config);
  }

  Testing::ScriptedServer answering{[](Testing::ServerConnection &connection) {
    connection.ReadRequest();
    connection.Write(HttpResponse(Testing::IssueResponse(Testing::BearerXml())));
  }};
  Testing::ScriptedServer stalling{[](Testing::ServerConnection &connection) { connection.Stall(); }};
};

TEST_F(LoopbackClient, AcquiresInACallThatWaits) {
  EXPECT_EQ(ClientOf(answering)->Acquire(Alice(), SpecFor(60))->GetSubject().ToString(), SUBJECT);
}

TEST_F(LoopbackClient, AcquiresWithACallback) {
  const auto client = ClientOf(answering);
  const Outcomes outcomes;
  client->AcquireAsync(Alice(), SpecFor(60), {}, outcomes.Record());
  EXPECT_EQ(outcomes.Wait(), Strings{SUBJECT});
}

TEST_F(LoopbackClient, AcquiresWithAFuture) {
  const auto client = ClientOf(answering);
  EXPECT_EQ(client->AcquireFuture(Alice(), SpecFor(60)).get()->GetSubject().ToString(), SUBJECT);
}

TEST_F(LoopbackClient, EndsACallThatWaitsAtItsDeadlineAndClosesTheConnection) {
  const auto client = ClientOf(stalling);
  const auto options = CallOptions::WithTimeout(std::chrono::milliseconds(50));
  EXPECT_EQ(EndOf([&] { client->Acquire(Alice(), SpecFor(60), options); }), Testing::LATE);
  EXPECT_TRUE(Testing::Eventually([&] { return stalling.GetOpenCount() == 0; }));
}

TEST_F(LoopbackClient, EndsAnAsynchronousOperationAtItsDeadlineAndClosesTheConnection) {
  const auto client = ClientOf(stalling);
  const Outcomes outcomes;
  client->AcquireAsync(Alice(), SpecFor(60), CallOptions::WithTimeout(std::chrono::milliseconds(50)),
                       outcomes.Record());
  EXPECT_EQ(outcomes.Wait(), Strings{Testing::LATE});
  EXPECT_TRUE(Testing::Eventually([&] { return stalling.GetOpenCount() == 0; }));
}

TEST_F(LoopbackClient, EndsACancelledOperationAndClosesTheConnection) {
  const auto client = ClientOf(stalling);
  const CancelSource source;
  CallOptions options;
  options.cancelToken = source.GetToken();
  const Outcomes outcomes;
  client->AcquireAsync(Alice(), SpecFor(60), options, outcomes.Record());
  EXPECT_TRUE(Testing::Eventually([&] { return stalling.GetOpenCount() == 1; }));
  source.Cancel();
  EXPECT_EQ(outcomes.Wait(), Strings{Testing::CANCELLED});
  EXPECT_TRUE(Testing::Eventually([&] { return stalling.GetOpenCount() == 0; }));
}

/// An operation in its forms.
struct Operation {
  const char *name;
  std::string sent;   ///< the request
  std::string answer; ///< of the service
  std::string result; ///< as text
  std::function<std::string(const TokenClient &)> wait;
  std::function<void(const TokenClient &, const Outcomes &)> start;
  std::function<std::string(const TokenClient &)> future;
};

void PrintTo(const Operation &operation, std::ostream *out) {
  *out << operation.name;
}

Operation AcquisitionBy(const char *name, const std::string &sent, const Credential &credential) {
  return {name,
          sent,
          "issued:" + Testing::BearerXml(),
          SUBJECT,
          [credential](const TokenClient &client) {
            return client.Acquire(credential, SpecFor(60))->GetSubject().ToString();
          },
          [credential](const TokenClient &client, const Outcomes &outcomes) {
            client.AcquireAsync(credential, SpecFor(60), {}, outcomes.Record());
          },
          [credential](const TokenClient &client) {
            return client.AcquireFuture(credential, SpecFor(60)).get()->GetSubject().ToString();
          }};
}

Operation RenewalOf(const std::shared_ptr<const SamlToken> &token) {
  return {"Renew",
          "Renew 60",
          "renewed:" + Testing::BearerXml(),
          SUBJECT,
          [token](const TokenClient &client) { return client.Renew(token, 60)->GetSubject().ToString(); },
          [token](const TokenClient &client, const Outcomes &outcomes) {
            client.RenewAsync(token, 60, {}, outcomes.Record());
          },
          [token](const TokenClient &client) { return client.RenewFuture(token, 60).get()->GetSubject().ToString(); }};
}

Operation ValidationOf(const std::shared_ptr<const SamlToken> &token, const std::string &result) {
  return {result == "true" ? "ValidateValid" : "ValidateInvalid",
          "ValidateSubject",
          "valid:" + result,
          result,
          [token](const TokenClient &client) { return std::string(client.Validate(token) ? "true" : "false"); },
          [token](const TokenClient &client, const Outcomes &outcomes) {
            client.ValidateAsync(token, {}, outcomes.Record<ValidityOutcome>());
          },
          [token](const TokenClient &client) {
            return std::string(client.ValidateFuture(token).get() ? "true" : "false");
          }};
}

NegotiationCredential Negotiation(std::vector<std::shared_ptr<Testing::Bytes>> legs) {
  return {[legs = std::move(legs)] { return std::make_shared<Testing::NegotiationHandlerStandIn>(legs); }};
}

std::vector<Operation> Operations() {
  const auto token = Testing::HolderToken();
  Operation negotiation =
      AcquisitionBy("AcquireByNegotiation", "InitialSPNego 60 one", Negotiation({Testing::Leg("one")}));
  negotiation.answer = "leg:ctx||" + Testing::BearerXml();
  return {AcquisitionBy("AcquireByPassword", "UserPass alice secret 60", Alice()),
          AcquisitionBy("AcquireByCertificate", "Certificate 60", CertificateCredential()),
          AcquisitionBy("AcquireByToken", "Exchange 60", TokenCredential{token}),
          negotiation,
          RenewalOf(token),
          ValidationOf(token, "true"),
          ValidationOf(token, "false")};
}

class EachOperation : public testing::TestWithParam<Operation> {
protected:
  const std::shared_ptr<ScriptedTransport> transport = std::make_shared<ScriptedTransport>(
      [](const Request &, int) { return boost::make_optional(Testing::Success(GetParam().answer)); });
  const std::shared_ptr<TokenClient> client = ClientOn(transport);
};

TEST_P(EachOperation, ReturnsItsResultInEachForm) {
  EXPECT_EQ(GetParam().wait(*client), GetParam().result);
  const Outcomes outcomes;
  GetParam().start(*client, outcomes);
  EXPECT_EQ(outcomes.Wait(), Strings{GetParam().result});
  EXPECT_EQ(GetParam().future(*client), GetParam().result);
  EXPECT_EQ(transport->Sent(), (Strings{"1: " + GetParam().sent, "2: " + GetParam().sent, "3: " + GetParam().sent}));
}

INSTANTIATE_TEST_SUITE_P(Of, EachOperation, testing::ValuesIn(Operations()),
                         [](const auto &tested) { return std::string(tested.param.name); });

/// Answers with texts, one for each request.
std::shared_ptr<ScriptedTransport> Answering(Strings answers) {
  return std::make_shared<ScriptedTransport>([answers = std::move(answers)](const Request &, int number) {
    return boost::make_optional(Testing::Success(answers.at(static_cast<std::size_t>(number) - 1)));
  });
}

TEST(TokenClient, NegotiatesManyLegsInOneSession) {
  const auto transport = Answering({"leg:ctx|s1|", "leg:ctx|s2|", "leg:ctx|final|" + Testing::BearerXml()});
  const auto handler =
      std::make_shared<Testing::NegotiationHandlerStandIn>(std::vector<std::shared_ptr<Testing::Bytes>>{
          Testing::Leg("c1"), Testing::Leg("c2"), Testing::Leg("c3"), Testing::Leg("last")});
  const NegotiationCredential credential{[handler] { return handler; }};
  EXPECT_EQ(ClientOn(transport)->Acquire(credential, SpecFor(60))->GetSubject().ToString(), SUBJECT);
  EXPECT_EQ(transport->Sent(),
            (Strings{"1: InitialSPNego 60 c1", "1: ContinuedSPNego ctx c2", "1: ContinuedSPNego ctx c3"}));
  EXPECT_EQ(handler->received, (Strings{"", "s1", "s2", "final"}));
}

/// A negotiation in which the thread that sends is still sending when another thread has read the answer.
class SlowSending : public testing::Test {
protected:
  NegotiationCredential GetCredential() {
    return {[this] {
      auto handler = std::make_shared<Testing::NegotiationHandlerStandIn>(std::vector{Testing::Leg("one")});
      made = handler;
      return handler;
    }};
  }

  const std::shared_ptr<Testing::EventCount> read = std::make_shared<Testing::EventCount>();
  const std::shared_ptr<ScriptedTransport> transport = std::make_shared<ScriptedTransport>(
      [](const Request &, int) { return boost::make_optional(Testing::Success("leg:ctx||" + Testing::BearerXml())); },
      [read = read] {
        EXPECT_TRUE(read->WaitFor(1));
        std::this_thread::sleep_for(std::chrono::milliseconds(100)); // long enough to end the operation too early
      });
  const std::shared_ptr<TokenClient> client = ClientOn(transport, [this] {
    Testing::ClientParts parts;
    parts.onRead = [read = read] { read->Add(); };
    return parts;
  }());
  std::weak_ptr<NegotiationHandler> made;
};

TEST_F(SlowSending, EndsAndItsHandlerIsDestroyedBeforeTheCallReturns) {
  EXPECT_EQ(client->Acquire(GetCredential(), SpecFor(60))->GetSubject().ToString(), SUBJECT);
  EXPECT_TRUE(made.expired());
}

TEST_F(SlowSending, EndsAndItsHandlerIsDestroyedBeforeTheCallback) {
  std::promise<bool> isDestroyed;
  client->AcquireAsync(GetCredential(), SpecFor(60), {},
                       [&](const TokenOutcome &) { isDestroyed.set_value(made.expired()); });
  EXPECT_TRUE(isDestroyed.get_future().get());
}

TEST(TokenClient, RefusesNullArguments) {
  const auto transport = std::make_shared<ScriptedTransport>(Testing::Issue);
  const auto client = ClientOn(transport);
  const char *const refused = "InvalidArgumentException: Invalid argument : a required object may not be NULL";
  EXPECT_EQ(EndOf([&] { client->AcquireAsync(Alice(), SpecFor(60), {}, nullptr); }), refused);
  EXPECT_EQ(EndOf([&] { client->RenewAsync(nullptr, 60, {}, nullptr); }), refused);
  EXPECT_EQ(EndOf([&] { client->ValidateAsync(nullptr, {}, nullptr); }), refused);
  const Outcomes outcomes;
  client->AcquireAsync(TokenCredential(), SpecFor(60), {}, outcomes.Record());
  client->AcquireAsync(NegotiationCredential(), SpecFor(60), {}, outcomes.Record());
  client->AcquireAsync(NegotiationCredential{[] { return nullptr; }}, SpecFor(60), {}, outcomes.Record());
  client->RenewAsync(nullptr, 60, {}, outcomes.Record());
  client->ValidateAsync(nullptr, {}, outcomes.Record<ValidityOutcome>());
  EXPECT_EQ(outcomes.Wait(5), Strings(5, refused));
  EXPECT_EQ(EndOf([&] { client->Renew(nullptr, 60); }), refused);
  EXPECT_EQ(transport->Sent(), Strings());
}

TEST(TokenClient, RefusesALegThatIsNull) {
  const auto client = ClientOn(std::make_shared<ScriptedTransport>(Testing::Issue));
  EXPECT_EQ(
      EndOf([&] { client->Acquire(Negotiation({nullptr}), SpecFor(60)); }),
      "InvalidArgumentException: Invalid argument : Invalid NegotiationHandler: the returned leg may not be NULL");
}

TEST(TokenClient, RefusesALegWithoutContext) {
  const auto client = ClientOn(Answering({"leg:|s1|"}));
  EXPECT_EQ(
      EndOf([&] { client->Acquire(Negotiation({Testing::Leg("c1")}), SpecFor(60)); }),
      "CommunicationException: Error processing the response to SPNego token request: no Context ID was returned.");
}

TEST(TokenClient, FailsWhenTheServiceReturnsAnEmptyTextInsteadOfAToken) {
  const char *const empty = "SsoException: The service returned an empty text instead of a token";
  EXPECT_EQ(EndOf([&] { ClientOn(Answering({"issued:"}))->Acquire(Alice(), SpecFor(60)); }), empty);
  EXPECT_EQ(EndOf([&] { ClientOn(Answering({"renewed:"}))->Renew(Testing::HolderToken(), 60); }), empty);
}

TEST(TokenClient, FailsLikeSecurityTokenService) {
  const std::string expired = Testing::ReadDataFile("tokens/expired.xml");
  const auto transport = Answering({"fault:wrong password", "issued:" + expired, "nonsense"});
  const auto client = ClientOn(transport);
  const auto service = Testing::ServiceOn(
      std::make_shared<Testing::TransportStandIn>([expired, number = std::make_shared<int>(0)](const Request &) {
        return ++*number == 1 ? "fault:wrong password" : *number == 2 ? "issued:" + expired : std::string("nonsense");
      }));
  for (int i = 0; i < 3; ++i) {
    EXPECT_EQ(EndOf([&] { client->Acquire(Alice(), SpecFor(60)); }),
              EndOf([&] { service->AcquireToken("alice", "secret", SpecFor(60)); }));
  }
}

TEST(TokenClient, PassesOnWhatAHandlerThrows) {
  const auto client = ClientOn(std::make_shared<ScriptedTransport>(Testing::Issue));
  const NegotiationCredential noMemory{[]() -> std::shared_ptr<NegotiationHandler> { throw std::bad_alloc(); }};
  const NegotiationCredential foreign{[]() -> std::shared_ptr<NegotiationHandler> { throw 7; }};
  EXPECT_EQ(EndOf([&] { client->Acquire(noMemory, SpecFor(60)); }), "bad_alloc: std::bad_alloc");
  EXPECT_EQ(EndOf([&] { client->Acquire(foreign, SpecFor(60)); }), "int");
  const Outcomes outcomes;
  client->AcquireAsync(foreign, SpecFor(60), {}, outcomes.Record());
  EXPECT_EQ(outcomes.Wait(), Strings{"int"});
}

TEST(TokenClient, ReportsWhatTheTransportThrowsWhenARequestStarts) {
  const auto client = ClientOn(std::make_shared<ScriptedTransport>(
      [](const Request &, int) -> boost::optional<Testing::Reply> { throw std::runtime_error("no descriptor"); }));
  EXPECT_EQ(EndOf([&] { client->Acquire(Alice(), SpecFor(60)); }), "runtime_error: no descriptor");
  const Outcomes outcomes;
  client->AcquireAsync(Alice(), SpecFor(60), {}, outcomes.Record());
  EXPECT_EQ(outcomes.Wait(), Strings{"runtime_error: no descriptor"});
}

TEST(TokenClient, VerifiesALongResponseOfAWaitingCallOnAnotherThread) {
  std::set<std::thread::id> threads;
  const auto readOn = [&](std::size_t octets) {
    Testing::ClientParts parts;
    parts.onRead = [&] { threads.insert(std::this_thread::get_id()); };
    Testing::Reply reply = Testing::Success("issued:" + Testing::BearerXml());
    reply.facts.octets = octets;
    const auto transport =
        std::make_shared<ScriptedTransport>([reply](const Request &, int) { return boost::make_optional(reply); });
    threads.clear();
    ClientOn(transport, parts)->Acquire(Alice(), SpecFor(60));
    return threads.count(std::this_thread::get_id());
  };
  EXPECT_EQ(readOn(1024 * 1024), 1u);
  EXPECT_EQ(readOn(1024 * 1024 + 1), 0u);
}

TEST(TokenClient, RunsCallbacksOnTheExecutorOfTheCallOrOfTheClient) {
  const auto counted = [](const std::shared_ptr<std::atomic<int>> &count) {
    return [count](const std::function<void()> &function) {
      ++*count;
      function();
    };
  };
  const auto ofClient = std::make_shared<std::atomic<int>>(0);
  const auto ofCall = std::make_shared<std::atomic<int>>(0);
  Testing::ClientParts parts;
  parts.options.executor = counted(ofClient);
  const auto client = ClientOn(std::make_shared<ScriptedTransport>(Testing::Issue), parts);
  const Outcomes outcomes;
  client->AcquireAsync(Alice(), SpecFor(60), {}, outcomes.Record());
  outcomes.Wait(1);
  CallOptions options;
  options.executor = counted(ofCall);
  client->AcquireAsync(Alice(), SpecFor(60), options, outcomes.Record());
  EXPECT_EQ(outcomes.Wait(2), Strings(2, SUBJECT));
  EXPECT_EQ(*ofClient, 1);
  EXPECT_EQ(*ofCall, 1);
}

TEST(TokenClient, LogsWhatACallbackThrowsAndContinues) {
  const Testing::ScopedLogLevel level(LOG_LEVEL_CONTRACT_WARNING);
  const Testing::RecordedLog log;
  const auto client = ClientOn(std::make_shared<ScriptedTransport>(Testing::Issue));
  client->AcquireAsync(Alice(), SpecFor(60), {}, [](const TokenOutcome &) { throw std::runtime_error("mine"); });
  EXPECT_TRUE(log.WaitForLines(1));
  EXPECT_EQ(log.Lines(), Strings{"SsoClient 8 A callback threw runtime_error: mine"});
  EXPECT_EQ(client->Acquire(Alice(), SpecFor(60))->GetSubject().ToString(), SUBJECT);
}

TEST(CallOptions, HasADeadlineForEveryTimeout) {
  const auto deadlineAfter = [](std::chrono::milliseconds time) { return *CallOptions::WithTimeout(time).deadline; };
  const auto now = CallOptions::Clock::now();
  EXPECT_LT(deadlineAfter(std::chrono::milliseconds::min()), now);
  EXPECT_LT(deadlineAfter(std::chrono::milliseconds(-1)), CallOptions::Clock::now());
  EXPECT_GT(deadlineAfter(std::chrono::milliseconds::max()), now + std::chrono::hours(24 * 365 * 99));
}

} // namespace
} // namespace SsoClient
