// SPDX-License-Identifier: Apache-2.0
// At each of its steps, an operation is cancelled, or its deadline passes, or its client is destroyed.
#include "client_setup.h"
#include "stepped_time.h"
#include "support/recorded_events.h"
#include "support/recorded_log.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using std::chrono::milliseconds;
using Testing::Alice;
using Testing::ClientOn;
using Testing::ClientParts;
using Testing::EndOf;
using Testing::Gate;
using Testing::Outcomes;
using Testing::ScriptedTransport;
using Testing::SpecFor;
using Testing::SteppedTime;
using Strings = std::vector<std::string>;

/// Where an operation is when it is ended.
enum class Stage { COMPOSE, SEND, WAIT, READ, MAKE_HANDLER, LEG, FINAL_LEG };
/// What ends it.
enum class Cause { CANCEL, DEADLINE, DESTROY };

struct DecisionCase {
  const char *name;
  Stage stage;
  Cause cause;
};

void PrintTo(const DecisionCase &value, std::ostream *out) {
  *out << value.name;
}

std::vector<DecisionCase> Cases() {
  return {{"CancelledWhileComposing", Stage::COMPOSE, Cause::CANCEL},
          {"LateWhileComposing", Stage::COMPOSE, Cause::DEADLINE},
          {"DestroyedWhileComposing", Stage::COMPOSE, Cause::DESTROY},
          {"CancelledWhileSending", Stage::SEND, Cause::CANCEL},
          {"LateWhileSending", Stage::SEND, Cause::DEADLINE},
          {"DestroyedWhileSending", Stage::SEND, Cause::DESTROY},
          {"CancelledWhileWaiting", Stage::WAIT, Cause::CANCEL},
          {"LateWhileWaiting", Stage::WAIT, Cause::DEADLINE},
          {"DestroyedWhileWaiting", Stage::WAIT, Cause::DESTROY},
          {"CancelledWhileReading", Stage::READ, Cause::CANCEL},
          {"LateWhileReading", Stage::READ, Cause::DEADLINE},
          {"DestroyedWhileReading", Stage::READ, Cause::DESTROY},
          {"CancelledWhileMakingTheHandler", Stage::MAKE_HANDLER, Cause::CANCEL},
          {"LateWhileMakingTheHandler", Stage::MAKE_HANDLER, Cause::DEADLINE},
          {"DestroyedWhileMakingTheHandler", Stage::MAKE_HANDLER, Cause::DESTROY},
          {"CancelledDuringALeg", Stage::LEG, Cause::CANCEL},
          {"LateDuringALeg", Stage::LEG, Cause::DEADLINE},
          {"DestroyedDuringALeg", Stage::LEG, Cause::DESTROY},
          {"CancelledDuringTheFinalLeg", Stage::FINAL_LEG, Cause::CANCEL},
          {"LateDuringTheFinalLeg", Stage::FINAL_LEG, Cause::DEADLINE},
          {"DestroyedDuringTheFinalLeg", Stage::FINAL_LEG, Cause::DESTROY}};
}

/// Waits at the gate in its final leg, or in its first one.
class StoppingHandler final : public NegotiationHandler {
public:
  StoppingHandler(std::shared_ptr<Gate> gate, bool isFinal) : m_gate(std::move(gate)), m_isFinal(isFinal) {}

  std::shared_ptr<std::vector<std::uint8_t>> NegotiateLeg(const std::vector<std::uint8_t> &serviceLeg) override {
    if (serviceLeg.empty() != m_isFinal) {
      m_gate->Pass();
    }
    return Testing::Leg("leg");
  }

private:
  const std::shared_ptr<Gate> m_gate;
  const bool m_isFinal;
};

/// Destroys the client, and waits until its operations are destroyed, too: a step that still runs would use the clock of
/// the test, and would write into the log of the next one.
void ReleaseClient(std::shared_ptr<TokenClient> &client, const std::shared_ptr<Testing::RecordedEvents> &observer) {
  client = nullptr;
  EXPECT_TRUE(Testing::Eventually([&observer] { return observer.use_count() == 1; }));
}

class Decision : public testing::TestWithParam<DecisionCase> {
protected:
  Decision() {
    const Stage stage = GetParam().stage;
    transport = std::make_shared<ScriptedTransport>([stage, gate = gate](const Request &, int) {
      if (stage == Stage::SEND) {
        gate->Pass();
      }
      if (stage == Stage::WAIT || stage == Stage::SEND) {
        return boost::optional<Testing::Reply>();
      }
      return boost::make_optional(Testing::Success(stage == Stage::FINAL_LEG ? "leg:ctx|final|" + Testing::BearerXml()
                                                                             : "issued:" + Testing::BearerXml()));
    });
    ClientParts parts;
    parts.time = &time;
    parts.options.service.observer = observer;
    parts.onCompose = PassAt(Stage::COMPOSE);
    parts.onRead = PassAt(Stage::READ);
    client = ClientOn(transport, parts);
    options.cancelToken = source.GetToken();
    options.deadline = time.GetSteadyTime() + milliseconds(1000);
  }
  ~Decision() override {
    gate->Open();
    ReleaseClient(client, observer);
  }

  std::function<void()> PassAt(Stage stage) const {
    return [isHere = stage == GetParam().stage, gate = gate] {
      if (isHere) {
        gate->Pass();
      }
    };
  }

  static bool UsesHandler() {
    const Stage stage = GetParam().stage;
    return stage == Stage::LEG || stage == Stage::FINAL_LEG || stage == Stage::MAKE_HANDLER;
  }

  Credential GetCredential() const {
    const Stage stage = GetParam().stage;
    if (!UsesHandler()) {
      return Alice();
    }
    return NegotiationCredential{[gate = gate, stage]() -> std::shared_ptr<NegotiationHandler> {
      if (stage == Stage::MAKE_HANDLER) {
        gate->Pass();
      }
      const auto passed = std::make_shared<Gate>();
      passed->Open();
      return std::make_shared<StoppingHandler>(stage == Stage::MAKE_HANDLER ? passed : gate, stage == Stage::FINAL_LEG);
    }};
  }

  void WaitForStage() const {
    EXPECT_TRUE(GetParam().stage == Stage::WAIT ? transport->WaitForSent(1) : gate->WaitForArrivals(1));
  }

  void End() {
    switch (GetParam().cause) {
    case Cause::CANCEL:
      source.Cancel();
      break;
    case Cause::DEADLINE:
      time.Advance(milliseconds(1000));
      break;
    case Cause::DESTROY:
      client = nullptr;
      break;
    }
  }

  std::string GetExpected() const {
    return GetParam().cause == Cause::CANCEL     ? Testing::CANCELLED
           : GetParam().cause == Cause::DEADLINE ? Testing::LATE
                                                 : Testing::DESTROYED;
  }

  SteppedTime time;
  const std::shared_ptr<Gate> gate = std::make_shared<Gate>();
  const std::shared_ptr<Testing::RecordedEvents> observer = std::make_shared<Testing::RecordedEvents>();
  std::shared_ptr<ScriptedTransport> transport;
  std::shared_ptr<TokenClient> client;
  const CancelSource source;
  CallOptions options;
  const Outcomes outcomes;
};

TEST_P(Decision, EndsTheOperationAtOnceWithOneOutcomeAndReleasesItWhenItsStepEnds) {
  client->AcquireAsync(GetCredential(), SpecFor(60), options, outcomes.Record());
  WaitForStage();
  End();
  EXPECT_EQ(outcomes.Wait(), Strings{GetExpected()}); // the step has not ended
  const Strings events = observer->Lines();
  EXPECT_EQ(events.front(), std::string("started ") + (UsesHandler() ? "AcquireTokenByGSS" : "AcquireToken"));
  EXPECT_EQ(events.back(), "ended " + GetExpected());
  gate->Open();
  EXPECT_TRUE(outcomes.AreReleased());
  EXPECT_TRUE(Testing::Eventually([&] { return transport->CountOpenSessions() == 0; }));
  client = nullptr;
  EXPECT_EQ(observer->Lines(), events);
  EXPECT_EQ(outcomes.Get(), Strings{GetExpected()});
  EXPECT_EQ(time.CountTimers(), 0);
}

TEST_P(Decision, CancelsARequestThatIsUnderWay) {
  client->AcquireAsync(GetCredential(), SpecFor(60), options, outcomes.Record());
  WaitForStage();
  End();
  outcomes.Wait();
  gate->Open();
  EXPECT_TRUE(outcomes.AreReleased());
  const int underWay = GetParam().stage == Stage::WAIT || GetParam().stage == Stage::SEND ? 1 : 0;
  EXPECT_TRUE(Testing::Eventually([&] { return transport->CountCancelled() == underWay; }));
}

INSTANTIATE_TEST_SUITE_P(At, Decision, testing::ValuesIn(Cases()),
                         [](const auto &tested) { return std::string(tested.param.name); });

/// A client whose requests are not answered before the test answers them.
class HeldClient : public testing::Test {
protected:
  HeldClient() {
    ClientParts parts;
    parts.time = &time;
    parts.options.service.observer = observer;
    client = ClientOn(transport, parts);
    options.cancelToken = source.GetToken();
  }
  ~HeldClient() override { ReleaseClient(client, observer); }

  SteppedTime time;
  const std::shared_ptr<Testing::RecordedEvents> observer = std::make_shared<Testing::RecordedEvents>();
  const std::shared_ptr<ScriptedTransport> transport = std::make_shared<ScriptedTransport>(Testing::Hold);
  std::shared_ptr<TokenClient> client;
  const CancelSource source;
  CallOptions options;
  const Outcomes outcomes;
};

TEST_F(HeldClient, ComposesNothingWhenTheTokenIsCancelledBeforeTheStart) {
  source.Cancel();
  options.deadline = time.GetSteadyTime(); // cancelled has precedence
  client->AcquireAsync(Alice(), SpecFor(60), options, outcomes.Record());
  EXPECT_EQ(outcomes.Wait(), Strings{Testing::CANCELLED});
  EXPECT_EQ(EndOf([&] { client->Acquire(Alice(), SpecFor(60), options); }), Testing::CANCELLED);
  EXPECT_EQ(EndOf([&] { client->AcquireFuture(Alice(), SpecFor(60), options).get(); }), Testing::CANCELLED);
  EXPECT_EQ(transport->Sent(), Strings());
  EXPECT_EQ(observer->Lines()[0], "started AcquireToken");
  EXPECT_EQ(observer->Lines()[1], std::string("ended ") + Testing::CANCELLED);
}

TEST_F(HeldClient, ComposesNothingWhenTheDeadlineHasPassed) {
  options.deadline = time.GetSteadyTime();
  client->AcquireAsync(Alice(), SpecFor(60), options, outcomes.Record());
  EXPECT_EQ(outcomes.Wait(), Strings{Testing::LATE});
  EXPECT_EQ(EndOf([&] { client->Acquire(Alice(), SpecFor(60), options); }), Testing::LATE);
  EXPECT_EQ(EndOf([&] { client->AcquireFuture(Alice(), SpecFor(60), options).get(); }), Testing::LATE);
  EXPECT_EQ(transport->Sent(), Strings());
}

TEST_F(HeldClient, NeverCallsBackWithinTheCallThatStarts) {
  source.Cancel();
  client->AcquireAsync(Alice(), SpecFor(60), options, outcomes.Record());
  outcomes.Wait();
  EXPECT_EQ(outcomes.Threads().count(std::this_thread::get_id()), 0u);
}

TEST_F(HeldClient, DoesNotRunObserverOrCallbackOnTheThreadThatCancels) {
  client->AcquireAsync(Alice(), SpecFor(60), options, outcomes.Record());
  transport->WaitForSent(1);
  source.Cancel();
  outcomes.Wait();
  EXPECT_EQ(outcomes.Threads().count(std::this_thread::get_id()), 0u);
}

TEST_F(HeldClient, EndsACallThatWaitsWhenItIsCancelledOnAnotherThread) {
  std::thread canceller([&] {
    transport->WaitForSent(1);
    source.Cancel();
  });
  EXPECT_EQ(EndOf([&] { client->Acquire(Alice(), SpecFor(60), options); }), Testing::CANCELLED);
  canceller.join();
  EXPECT_TRUE(Testing::Eventually([&] { return transport->CountCancelled() == 1; }));
}

TEST_F(HeldClient, EndsACallThatWaitsDuringALegOfItsHandler) {
  const auto gate = std::make_shared<Gate>();
  const NegotiationCredential credential{[gate] { return std::make_shared<StoppingHandler>(gate, false); }};
  std::thread canceller([&] {
    gate->WaitForArrivals(1);
    source.Cancel();
  });
  EXPECT_EQ(EndOf([&] { client->Acquire(credential, SpecFor(60), options); }), Testing::CANCELLED);
  canceller.join();
  gate->Open();
}

TEST_F(HeldClient, EndsARequestAfterFourMinutesLikeSecurityTokenService) {
  client->AcquireAsync(Alice(), SpecFor(60), options, outcomes.Record());
  transport->WaitForSent(1);
  time.Advance(std::chrono::minutes(4) - milliseconds(1));
  EXPECT_EQ(transport->CountTimedOut(), 0);
  time.Advance(milliseconds(1));
  EXPECT_EQ(outcomes.Wait(), Strings{"CommunicationException: No response from sts.test:443 within 240 seconds"});
  EXPECT_EQ(transport->CountTimedOut(), 1);
  EXPECT_EQ(transport->CountCancelled(), 0);
}

TEST_F(HeldClient, LimitsARequestToFourMinutesWhenTheDeadlineIsLater) {
  options.deadline = time.GetSteadyTime() + std::chrono::hours(1);
  client->AcquireAsync(Alice(), SpecFor(60), options, outcomes.Record());
  transport->WaitForSent(1);
  time.Advance(std::chrono::minutes(4));
  EXPECT_EQ(outcomes.Wait(), Strings{"CommunicationException: No response from sts.test:443 within 240 seconds"});
}

TEST_F(HeldClient, EndsTheOperationsOfADestroyedClientOnly) {
  const auto other = ClientOn(transport);
  const Outcomes othersOutcomes;
  other->AcquireAsync(Alice(), SpecFor(60), {}, othersOutcomes.Record());
  for (int i = 0; i < 100; ++i) {
    client->AcquireAsync(Alice(), SpecFor(60), {}, outcomes.Record());
  }
  transport->WaitForSent(101);
  client = nullptr;
  EXPECT_EQ(outcomes.Wait(100), Strings(100, Testing::DESTROYED));
  EXPECT_EQ(othersOutcomes.Get(), Strings());
  transport->AnswerHeld(Testing::Success("issued:" + Testing::BearerXml()));
  EXPECT_EQ(othersOutcomes.Wait(), Strings{"{Name: alice; Domain:corp.example}"});
}

TEST_F(HeldClient, MayBeDestroyedInACallback) {
  const auto record = outcomes.Record();
  client->AcquireAsync(Alice(), SpecFor(60), options, [this, record](const TokenOutcome &outcome) {
    client = nullptr;
    record(outcome);
  });
  client->AcquireAsync(Alice(), SpecFor(60), {}, outcomes.Record());
  transport->WaitForSent(2);
  source.Cancel();
  EXPECT_EQ(outcomes.Wait(2).size(), 2u);
  Strings ends = outcomes.Get();
  std::sort(ends.begin(), ends.end());
  EXPECT_EQ(ends, (Strings{Testing::CANCELLED, Testing::DESTROYED}));
}

TEST_F(HeldClient, ReleasesCredentialAndSpecWhenTheRequestHasBeenComposed) {
  auto token = Testing::HolderToken();
  const std::weak_ptr<const SamlToken> released = token;
  client->AcquireAsync(TokenCredential{std::exchange(token, nullptr)}, SpecFor(60), options, outcomes.Record());
  transport->WaitForSent(1);
  EXPECT_TRUE(Testing::Eventually([&] { return released.expired(); }));
  EXPECT_EQ(outcomes.Get(), Strings());
}

TEST_F(HeldClient, KeepsTheCredentialForFurtherAttemptsUntilTheOperationEnds) {
  auto token = Testing::HolderToken();
  const std::weak_ptr<const SamlToken> released = token;
  options.retryPolicy = RetryPolicy();
  options.retryPolicy->attempts = 2;
  client->AcquireAsync(TokenCredential{std::exchange(token, nullptr)}, SpecFor(60), options, outcomes.Record());
  transport->WaitForSent(1);
  EXPECT_FALSE(released.expired());
  source.Cancel();
  outcomes.Wait();
  EXPECT_TRUE(Testing::Eventually([&] { return released.expired(); }));
}

} // namespace
} // namespace SsoClient
