// SPDX-License-Identifier: Apache-2.0
// An observer receives the events of the handler, and its exceptions change nothing.

#include "integration/gssapi/negotiation_fixture.h"
#include "spnego_handler_impl.h"
#include "support/recorded_log.h"
#include "support/throws_message.h"

#include <ssoclient/gssapi/negotiation_observer.h>

#include <gtest/gtest.h>

#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace SsoClient::Gssapi {
namespace {

using Testing::Bytes;
using Testing::GssAcceptor;
using Testing::RealmWithAlice;
using Testing::SettingsFor;

/// Writes each event as a line. Durations are left out.
class LineObserver final : public NegotiationObserver {
public:
  void OnLeg(const NegotiationLegEvent &event) override {
    lines.push_back("leg " + std::to_string(event.leg) + ": " + std::to_string(event.serviceOctets) + " in, " +
                    std::to_string(event.clientOctets) + " out, mechanism '" + event.mechanism + "'" +
                    (event.isComplete ? ", complete" : "") + (event.isMutuallyAuthenticated ? ", mutual" : ""));
    durations.push_back(event.durationMicroseconds);
  }
  void OnFailed(int leg, const std::exception &failure) override {
    lines.push_back("leg " + std::to_string(leg) + " failed: " + failure.what());
  }

  std::vector<std::string> lines;
  std::vector<std::int64_t> durations;
};

SpnegoSettings ObservedBy(const std::shared_ptr<NegotiationObserver> &observer) {
  SpnegoSettings settings = SettingsFor();
  settings.observer = observer;
  return settings;
}

TEST(NegotiationObserver, GetsNumberLengthsMechanismAndStateOfEachLeg) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  const auto observer = std::make_shared<LineObserver>();
  const auto handler = CreateSpnegoHandler(ObservedBy(observer));
  const Bytes first = *handler->NegotiateLeg({});
  const Bytes answer = service.Accept(first);
  handler->NegotiateLeg(answer);
  handler->NegotiateLeg({}); // called again, it has nothing to send
  EXPECT_EQ(observer->lines,
            (std::vector<std::string>{"leg 1: 0 in, " + std::to_string(first.size()) + " out, mechanism ''",
                                      "leg 2: " + std::to_string(answer.size()) +
                                          " in, 0 out, mechanism 'Kerberos 5', complete, mutual",
                                      "leg 3: 0 in, 0 out, mechanism 'Kerberos 5', complete, mutual"}));
}

TEST(NegotiationObserver, GetsTheTimeThatALegTook) {
  const RealmWithAlice world;
  world.LogIn();
  const auto observer = std::make_shared<LineObserver>();
  std::chrono::steady_clock::time_point now;
  // Each reading of the clock takes 100 microseconds. The handler also reads it for its limits.
  const auto clock = [&now] { return now += std::chrono::microseconds(100); };
  SpnegoHandlerImpl(ObservedBy(observer), clock).NegotiateLeg({});
  EXPECT_EQ(observer->durations, std::vector<std::int64_t>{400});
}

TEST(NegotiationObserver, GetsTheWholeMessageOfAFailure) {
  const RealmWithAlice world; // alice has no ticket
  const auto observer = std::make_shared<LineObserver>();
  const auto handler = CreateSpnegoHandler(ObservedBy(observer));
  std::string message;
  try {
    handler->NegotiateLeg({});
  } catch (const GssCredentialException &failure) {
    message = failure.what();
  }
  ASSERT_NE(message.find("No credentials in the default credential cache: "), std::string::npos) << message;
  EXPECT_THROWS_MESSAGE(handler->NegotiateLeg({}), Tarvel::InvalidStateException,
                        "The negotiation with sts@localhost has already failed");
  EXPECT_EQ(observer->lines,
            (std::vector<std::string>{"leg 1 failed: " + message,
                                      "leg 2 failed: The negotiation with sts@localhost has already failed"}));
}

class ThrowingObserver final : public NegotiationObserver {
public:
  void OnLeg(const NegotiationLegEvent &) override { throw std::runtime_error("the observer is broken"); }
  void OnFailed(int, const std::exception &) override { throw 7; }
};

TEST(NegotiationObserver, ThatThrowsIsLoggedAndChangesNothing) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  const Testing::RecordedLog log;
  const auto handler = CreateSpnegoHandler(ObservedBy(std::make_shared<ThrowingObserver>()));
  const Bytes answer = service.Accept(*handler->NegotiateLeg({}));
  handler->NegotiateLeg(answer);
  EXPECT_TRUE(handler->IsMutuallyAuthenticated());
  EXPECT_THROWS_MESSAGE(handler->NegotiateLeg({1}), GssNegotiationException,
                        "The service sts@localhost sent a further leg, but the negotiation is complete");
  const std::string onLeg = "SsoClient 8 The negotiation observer's OnLeg threw: the observer is broken";
  EXPECT_EQ(log.Lines(),
            (std::vector<std::string>{onLeg, onLeg,
                                      "SsoClient 8 The negotiation observer's OnFailed threw: an exception "
                                      "that is not a std::exception"}));
}

} // namespace
} // namespace SsoClient::Gssapi
