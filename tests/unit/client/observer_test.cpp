// SPDX-License-Identifier: Apache-2.0
// What the observer, the log and the sink of refused tokens receive from the operations of a client.
#include "client_setup.h"
#include "support/identity.h"
#include "support/recorded_events.h"
#include "support/recorded_log.h"
#include "unit/observed_service/observed_operations.h"

#include <ssoclient/logger.h>

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using Testing::Gate;
using Testing::Outcomes;
using Testing::RecordedEvents;
using Testing::ScriptedTransport;
using Testing::SpecFor;
using Strings = std::vector<std::string>;

/// A client whose builder and handler are real.
std::shared_ptr<TokenClient> RealClientOn(const std::shared_ptr<const Transport> &transport,
                                          const ClientOptions &options) {
  SecurityTokenServiceConfig config;
  config.stsUrl = "http://sts.test/";
  config.signingCertificates = Testing::TrustedCertificates();
  config.holderOfKeyConfig = Testing::HolderIdentity();
  return std::make_shared<TokenClient>(std::make_shared<ClientCore>(
      config, options,
      ClientCore::Collaborators{std::make_shared<const RequestBuilderImpl>(config.holderOfKeyConfig), transport,
                                std::make_shared<const ResponseHandlerImpl>()}));
}

/// Runs the operation of that name.
void RunOperation(const TokenClient &client, const std::string &name) {
  const auto held = Testing::HolderToken();
  if (name == "AcquireToken") {
    client.Acquire(PasswordCredential{"alice", Tarvel::SecretText(Testing::CANARY_PASSWORD)}, SpecFor(60));
  } else if (name == "AcquireTokenByGSS") {
    client.Acquire(NegotiationCredential{[] {
                     return std::make_shared<Testing::NegotiationHandlerStandIn>(
                         std::vector<std::shared_ptr<Testing::Bytes>>(2, Testing::Leg(Testing::CANARY_LEG)));
                   }},
                   SpecFor(60));
  } else if (name == "AcquireTokenByCertificate") {
    client.Acquire(CertificateCredential(), SpecFor(60));
  } else if (name == "AcquireTokenByToken") {
    client.Acquire(TokenCredential{held}, SpecFor(60));
  } else if (name == "ValidateSubject") {
    client.Validate(held);
  } else {
    client.Renew(held, 60);
  }
}

/// The end of an operation, its events, and its log without identifiers.
Strings Trace(const std::function<void(const std::shared_ptr<RecordedEvents> &)> &operation) {
  const auto observer = std::make_shared<RecordedEvents>();
  const Testing::RecordedLog log;
  Strings trace{Testing::EndOf([&] { operation(observer); })};
  for (const std::string &line : observer->Lines()) {
    trace.push_back(line);
  }
  for (std::string line : log.Lines()) {
    const std::size_t id = line.find("opId=");
    if (id != std::string::npos) {
      line.erase(id, 42);
    }
    for (const char *const own : {"SecurityTokenServiceImpl::", "TokenClient::"}) {
      const std::size_t at = line.find(own);
      if (at != std::string::npos) {
        line.erase(at, std::string(own).size());
      }
    }
    // Only `SecurityTokenService` writes these two lines.
    if (line.find("AcquireToken sending") == std::string::npos &&
        line.find("AcquireToken processing") == std::string::npos) {
      trace.push_back(line);
    }
  }
  return trace;
}

class ObservedClient : public testing::TestWithParam<Testing::ObservedOperation> {
protected:
  /// Compares `SecurityTokenService` and the client when each request is answered with `answer`.
  static void ExpectTheSame(const std::string &answer) {
    const Strings ofService = Trace([&](const std::shared_ptr<RecordedEvents> &observer) {
      ServiceOptions options;
      options.observer = observer;
      GetParam().run(*Testing::ObservedService([&](const Request &) { return answer; }, options));
    });
    const Strings ofClient = Trace([&](const std::shared_ptr<RecordedEvents> &observer) {
      ClientOptions options;
      options.service.observer = observer;
      const auto transport = std::make_shared<ScriptedTransport>(
          [&](const Request &, int) { return boost::make_optional(Testing::Success(answer)); });
      RunOperation(*RealClientOn(transport, options), GetParam().name);
    });
    EXPECT_GT(ofService.size(), 6u);
    EXPECT_EQ(ofClient, ofService);
  }
};

TEST_P(ObservedClient, ReportsLogsAndReturnsTheSameAsTheService) {
  ExpectTheSame(GetParam().respond(Testing::BearerXml()));
}

TEST_P(ObservedClient, FailsLikeTheServiceForAFaultThatRepeatsThePassword) {
  ExpectTheSame(Testing::FaultResponse("wst:FailedAuthentication",
                                       std::string("not ") + "canary-&lt;password>&amp;\"long\"" + " please"));
}

TEST_P(ObservedClient, FailsLikeTheServiceForATokenThatIsRefused) {
  ExpectTheSame(GetParam().respond(Testing::ReadDataFile("tokens/signed-by-other.xml")));
}

TEST_P(ObservedClient, FailsLikeTheServiceForTextThatIsNotXml) {
  ExpectTheSame("nonsense");
}

INSTANTIATE_TEST_SUITE_P(Of, ObservedClient, testing::ValuesIn(Testing::ObservedOperations()),
                         [](const auto &tested) { return std::string(tested.param.name); });

TEST(ObservedOperation, IsReportedToTheObserverOfTheCall) {
  const auto ofClient = std::make_shared<RecordedEvents>();
  const auto ofCall = std::make_shared<RecordedEvents>();
  Testing::ClientParts parts;
  parts.options.service.observer = ofClient;
  const auto client = Testing::ClientOn(std::make_shared<ScriptedTransport>(Testing::Issue), parts);
  CallOptions options;
  options.observer = ofCall;
  client->Acquire(Testing::Alice(), SpecFor(60), options);
  EXPECT_EQ(ofClient->Lines(), Strings());
  EXPECT_EQ(ofCall->Lines(),
            (Strings{"started AcquireToken", "sent urn:action", "received 200 OK, text/xml", "ended"}));
}

/// Cancels its operation before the request is sent.
class CancellingObserver final : public OperationObserver {
public:
  explicit CancellingObserver(CancelSource source) : m_source(std::move(source)) {}
  void OnRequestSent(const OperationInfo &, const RequestSentEvent &) override { m_source.Cancel(); }
  void OnResponseReceived(const OperationInfo &, const ResponseReceivedEvent &) override { ++eventsAfter; }
  void OnEnded(const OperationInfo &, const OperationEndedEvent &event) override { end = event.message; }

  int eventsAfter = 0;
  std::string end;

private:
  const CancelSource m_source;
};

TEST(ObservedOperation, MayBeCancelledByItsObserverBeforeItIsSent) {
  const CancelSource source;
  const auto observer = std::make_shared<CancellingObserver>(source);
  const auto transport = std::make_shared<ScriptedTransport>(Testing::Issue);
  CallOptions options;
  options.observer = observer;
  options.cancelToken = source.GetToken();
  const auto client = Testing::ClientOn(transport);
  EXPECT_EQ(Testing::EndOf([&] { client->Acquire(Testing::Alice(), SpecFor(60), options); }), Testing::CANCELLED);
  EXPECT_EQ(transport->Sent(), Strings());
  EXPECT_EQ(observer->eventsAfter, 0);
  EXPECT_EQ(observer->end, "The operation was cancelled");
}

/// Waits at the gate in the event of a response, and records that event and later ones.
class StoppingObserver final : public OperationObserver {
public:
  void OnResponseReceived(const OperationInfo &, const ResponseReceivedEvent &) override {
    gate.Pass();
    Add("received");
  }
  void OnFault(const OperationInfo &, const FaultEvent &) override { Add("fault"); }
  void OnEnded(const OperationInfo &, const OperationEndedEvent &event) override { Add("ended: " + event.message); }

  Strings Get() const {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_events;
  }

  Gate gate;

private:
  void Add(const std::string &event) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_events.push_back(event);
  }

  mutable std::mutex m_mutex;
  Strings m_events;
};

TEST(ObservedOperation, EndsAfterTheEventThatIsBeingReported) {
  const CancelSource source;
  const auto observer = std::make_shared<StoppingObserver>();
  const auto client = Testing::ClientOn(std::make_shared<ScriptedTransport>(Testing::Issue));
  CallOptions options;
  options.observer = observer;
  options.cancelToken = source.GetToken();
  const Outcomes outcomes;
  client->AcquireAsync(Testing::Alice(), SpecFor(60), options, outcomes.Record());
  EXPECT_TRUE(observer->gate.WaitForArrivals(1));
  source.Cancel();
  EXPECT_EQ(observer->Get(), Strings());
  EXPECT_EQ(outcomes.Get(), Strings());
  observer->gate.Open();
  EXPECT_EQ(outcomes.Wait(), Strings{Testing::CANCELLED});
  EXPECT_TRUE(outcomes.AreReleased());
  EXPECT_EQ(observer->Get(), (Strings{"received", "ended: The operation was cancelled"}));
}

/// Counts its calls.
class CountingListener final : public EventsEndListener {
public:
  void OnEventsEnded() noexcept override { ++calls; }
  std::atomic<int> calls{0};
};

TEST(EndOfEvents, IsReportedByTheThreadThatReportsAnEvent) {
  StoppingObserver observer;
  const std::string id;
  OperationEvents events(&observer, "AcquireToken", id);
  std::thread step([&events] {
    const ResponseFacts facts;
    events.EndExchange(&facts, "broken");
    events.EndExchange(&facts, "dropped, because it comes after the end");
  });
  EXPECT_TRUE(observer.gate.WaitForArrivals(1));
  CountingListener listener;
  EXPECT_FALSE(events.End(std::make_exception_ptr(SsoException("over")), listener));
  EXPECT_EQ(observer.Get(), Strings());
  EXPECT_EQ(listener.calls, 0);
  observer.gate.Open();
  step.join();
  EXPECT_EQ(observer.Get(), (Strings{"received", "ended: over"}));
  EXPECT_EQ(listener.calls, 1);
}

TEST(EndOfEvents, IsReportedAtOnceWhenNoEventIsBeingReported) {
  StoppingObserver observer;
  observer.gate.Open();
  const std::string id;
  OperationEvents events(&observer, "AcquireToken", id);
  CountingListener listener;
  EXPECT_TRUE(events.End(nullptr, listener));
  const ResponseFacts facts;
  events.EndExchange(&facts, "dropped");
  EXPECT_EQ(observer.Get(), (Strings{"ended: "}));
  EXPECT_EQ(listener.calls, 0);
}

TEST(RefusedTokenSink, MayThrowAfterItsOperationWasCancelled) {
  const auto gate = std::make_shared<Gate>();
  Testing::ClientParts parts;
  parts.onRead = [gate] { gate->Pass(); };
  parts.options.service.refusedTokenSink = [](const std::string &) { throw std::runtime_error("mine"); };
  const auto client = Testing::ClientOn(
      std::make_shared<ScriptedTransport>([](const Request &, int) {
        return boost::make_optional(Testing::Success("issued:" + Testing::ReadDataFile("tokens/signed-by-other.xml")));
      }),
      parts);
  const CancelSource source;
  CallOptions options;
  options.cancelToken = source.GetToken();
  const Outcomes outcomes;
  const Testing::ScopedLogLevel level(LOG_LEVEL_CONTRACT_WARNING);
  const Testing::RecordedLog log;
  client->AcquireAsync(Testing::Alice(), SpecFor(60), options, outcomes.Record());
  EXPECT_TRUE(gate->WaitForArrivals(1));
  source.Cancel();
  outcomes.Wait();
  gate->Open();
  EXPECT_TRUE(log.WaitForLines(1));
  const std::string line = log.Lines().at(0);
  EXPECT_EQ(line.substr(0, 17), "SsoClient 8 opId=");
  EXPECT_EQ(line.substr(17 + 36), " The sink of refused tokens threw runtime_error: mine");
}

TEST(PerCallOptions, UseTheirOwnDialectAndVerifyOptions) {
  const auto bodies = std::make_shared<Strings>();
  const auto client =
      RealClientOn(std::make_shared<ScriptedTransport>([bodies](const Request &request, int) {
                     bodies->push_back(request.body);
                     return boost::make_optional(Testing::Success(Testing::IssueResponse(Testing::BearerXml())));
                   }),
                   {});
  CallOptions options;
  options.dialect = ServiceDialect();
  options.dialect->appliesTo = "urn:other";
  options.verifyOptions = VerifyOptions();
  options.verifyOptions->acceptedAudiences = {"urn:mine"};
  options.verifyOptions->acceptUnrestrictedAudience = false;
  const std::string own = Testing::EndOf([&] { client->Acquire(Testing::Alice(), SpecFor(60), options); });
  EXPECT_EQ(own.substr(0, 14), "SsoException: ") << own;
  EXPECT_EQ(Testing::EndOf([&] { client->Acquire(Testing::Alice(), SpecFor(60)); }), "returned");
  EXPECT_NE(bodies->at(0).find("urn:other"), std::string::npos);
  EXPECT_EQ(bodies->at(1).find("urn:other"), std::string::npos);
}

TEST(PerCallOptions, AreRefusedInTheOutcome) {
  const auto client = Testing::ClientOn(std::make_shared<ScriptedTransport>(Testing::Issue));
  CallOptions options;
  options.verifyOptions = VerifyOptions();
  options.verifyOptions->acceptedRecipients = {"urn:mine"};
  const Outcomes outcomes;
  client->AcquireAsync(Testing::Alice(), SpecFor(60), options, outcomes.Record());
  const std::string outcome = outcomes.Wait().at(0);
  EXPECT_EQ(outcome, Testing::EndOf([] {
              VerifyOptions wrong;
              wrong.acceptedRecipients = {"urn:mine"};
              TokenVerifier(Testing::TrustedCertificates(), wrong);
            }));
  EXPECT_EQ(outcome.substr(0, 26), "InvalidArgumentException: ");
}

} // namespace
} // namespace SsoClient
