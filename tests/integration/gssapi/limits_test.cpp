// SPDX-License-Identifier: Apache-2.0
// The handler's limits, with a clock that the test sets.

#include "integration/gssapi/negotiation_fixture.h"
#include "spnego_handler_impl.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <limits>
#include <memory>

namespace SsoClient::Gssapi {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using Testing::Bytes;
using Testing::GssAcceptor;
using Testing::RealmWithAlice;
using Testing::SettingsFor;

TEST(HandlerLimits, AreTenLegsAndAMinuteByDefault) {
  const SpnegoSettings settings;
  EXPECT_EQ(settings.maximumLegs, 10);
  EXPECT_EQ(settings.timeLimitSec, 60);
}

TEST(HandlerLimits, EndANegotiationWithTooManyLegs) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  SpnegoSettings settings = SettingsFor();
  settings.dceStyle = true;
  settings.maximumLegs = 2;
  const auto handler = CreateSpnegoHandler(settings);
  const Bytes answer = service.Accept(*handler->NegotiateLeg({}));
  const Bytes finalLeg = service.Accept(*handler->NegotiateLeg(answer));
  EXPECT_THROWS_MESSAGE(handler->NegotiateLeg(finalLeg), GssLimitException,
                        "The negotiation with sts@localhost reached its limit on legs: 2");
  EXPECT_FALSE(handler->IsMutuallyAuthenticated());
}

TEST(HandlerLimits, AllowANegotiationThatEndsWithTheLastLeg) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  SpnegoSettings settings = SettingsFor();
  settings.dceStyle = true;
  settings.maximumLegs = 3;
  const auto handler = CreateSpnegoHandler(settings);
  EXPECT_EQ(Testing::Negotiate(*handler, service), 3);
  EXPECT_TRUE(handler->IsMutuallyAuthenticated());
}

TEST(HandlerLimits, EndANegotiationWithAServiceThatNeverIssuesTheToken) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  const auto handler = CreateSpnegoHandler(SettingsFor());
  EXPECT_EQ(Testing::Negotiate(*handler, service), 2);
  for (int leg = 3; leg <= 10; ++leg) {
    EXPECT_TRUE(handler->NegotiateLeg({})->empty());
  }
  EXPECT_THROWS_MESSAGE(handler->NegotiateLeg({}), GssLimitException,
                        "The negotiation with sts@localhost reached its limit on legs: 10");
}

/// A handler with a limit of five seconds, and its clock.
struct TimedNegotiation {
  std::chrono::steady_clock::time_point now{};
  seconds perReading{0}; ///< how far the clock advances each time it is read
  const std::shared_ptr<SpnegoHandlerImpl> handler = std::make_shared<SpnegoHandlerImpl>(FiveSeconds(), [this] {
    now += perReading;
    return now;
  });

  static SpnegoSettings FiveSeconds() {
    SpnegoSettings settings = SettingsFor();
    settings.timeLimitSec = 5;
    return settings;
  }
};

TEST(HandlerLimits, EndANegotiationThatTakesTooLong) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  TimedNegotiation timed;
  const Bytes finalLeg = service.Accept(*timed.handler->NegotiateLeg({}));
  timed.now += seconds(5) + milliseconds(1);
  EXPECT_THROWS_MESSAGE(timed.handler->NegotiateLeg(finalLeg), GssLimitException,
                        "The negotiation with sts@localhost reached its time limit: 5 s");
  EXPECT_FALSE(timed.handler->IsMutuallyAuthenticated());
}

TEST(HandlerLimits, AllowANegotiationThatTakesAllItsTime) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  TimedNegotiation timed;
  timed.now += seconds(1000); // time before the first leg does not count
  const Bytes finalLeg = service.Accept(*timed.handler->NegotiateLeg({}));
  timed.now += seconds(5);
  EXPECT_NO_THROW(timed.handler->NegotiateLeg(finalLeg));
  EXPECT_TRUE(timed.handler->IsMutuallyAuthenticated());
}

TEST(HandlerLimits, MayBeTheLargestNumber) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  SpnegoSettings settings = SettingsFor();
  settings.timeLimitSec = std::numeric_limits<std::int64_t>::max();
  EXPECT_EQ(Testing::Negotiate(*CreateSpnegoHandler(settings), service), 2);
}

TEST(HandlerLimits, IncludeTheTimeThatTheRealmTakes) {
  const RealmWithAlice world;
  world.LogIn();
  TimedNegotiation timed;
  timed.perReading = seconds(3); // the clock is read when the leg begins, before the realm's answer and after it
  EXPECT_THROWS_MESSAGE(timed.handler->NegotiateLeg({}), GssLimitException,
                        "The negotiation with sts@localhost reached its time limit: 5 s");
}

} // namespace
} // namespace SsoClient::Gssapi
