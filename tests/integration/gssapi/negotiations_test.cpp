// SPDX-License-Identifier: Apache-2.0
// How the development service keeps negotiations that have not ended.

#include "negotiations.h"
#include "refusal.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>

namespace DevSts {
namespace {

using std::chrono::seconds;
using Leg = std::vector<unsigned char>;

const Leg GO_ON = {'g'};
const Leg END = {'e'};
const Leg BAD = {'b'};

/// Goes by what the leg says.
class ScriptedAcceptance final : public Acceptance {
public:
  AcceptedLeg Accept(const Leg &leg) override {
    if (leg == BAD) {
      throw Refusal(Code::FAILED_AUTHENTICATION, "bad leg");
    }
    AcceptedLeg accepted;
    accepted.answer = leg;
    if (leg == END) {
      accepted.client = "alice@CORP.EXAMPLE";
    }
    return accepted;
  }
};

class ScriptedAcceptor final : public GssAcceptor {
public:
  std::unique_ptr<Acceptance> Begin() const override { return std::make_unique<ScriptedAcceptance>(); }
};

class OpenNegotiations : public testing::Test {
protected:
  std::chrono::steady_clock::time_point m_now{};
  Negotiations m_negotiations{std::make_unique<const ScriptedAcceptor>(), [this] { return m_now; }};
};

TEST_F(OpenNegotiations, RememberWhatTheFirstLegAskedForUntilTheLast) {
  NegotiatedRequest request;
  request.lifetime = std::chrono::hours(1);
  request.facts.audience = {"https://a.example/"};
  EXPECT_FALSE(m_negotiations.Begin("c", GO_ON, request).leg.client);
  EXPECT_EQ(m_negotiations.Continue("c", GO_ON).leg.answer, GO_ON);
  const NegotiationStep last = m_negotiations.Continue("c", END);
  EXPECT_EQ(last.leg.client, "alice@CORP.EXAMPLE");
  EXPECT_EQ(last.request.lifetime, std::chrono::hours(1));
  EXPECT_EQ(last.request.facts.audience, request.facts.audience);
}

TEST_F(OpenNegotiations, RefuseALegOfNone) {
  EXPECT_THROWS_MESSAGE(m_negotiations.Continue("c", GO_ON), Refusal,
                        "no negotiation with that context is waiting for a leg");
}

TEST_F(OpenNegotiations, RefuseALegOfOneThatHasEnded) {
  m_negotiations.Begin("c", END, {});
  EXPECT_THROWS_MESSAGE(m_negotiations.Continue("c", GO_ON), Refusal,
                        "no negotiation with that context is waiting for a leg");
}

TEST_F(OpenNegotiations, ForgetOneWhoseLegIsRefused) {
  m_negotiations.Begin("c", GO_ON, {});
  EXPECT_THROWS_MESSAGE(m_negotiations.Continue("c", BAD), Refusal, "bad leg");
  EXPECT_THROWS_MESSAGE(m_negotiations.Continue("c", GO_ON), Refusal,
                        "no negotiation with that context is waiting for a leg");
}

TEST_F(OpenNegotiations, ForgetOneAfterAMinute) {
  m_negotiations.Begin("c", GO_ON, {});
  m_now += seconds(60);
  EXPECT_NO_THROW(m_negotiations.Continue("c", GO_ON));
  m_now += seconds(1);
  EXPECT_THROWS_MESSAGE(m_negotiations.Continue("c", GO_ON), Refusal,
                        "no negotiation with that context is waiting for a leg");
}

TEST_F(OpenNegotiations, RefuseAContextThatIsTaken) {
  m_negotiations.Begin("c", GO_ON, {});
  EXPECT_THROWS_MESSAGE(m_negotiations.Begin("c", GO_ON, {}), Refusal,
                        "a negotiation with that context has already begun");
  EXPECT_NO_THROW(m_negotiations.Continue("c", GO_ON));
}

TEST_F(OpenNegotiations, AreAHundredAtMost) {
  for (int i = 0; i < 100; ++i) {
    m_negotiations.Begin(std::to_string(i), GO_ON, {});
  }
  EXPECT_THROWS_MESSAGE(m_negotiations.Begin("c", GO_ON, {}), Refusal, "too many unfinished negotiations");
  m_now += seconds(61);
  EXPECT_NO_THROW(m_negotiations.Begin("c", GO_ON, {}));
}

/// In the middle of a leg, the same negotiation is asked for again.
class NestedAcceptor final : public GssAcceptor {
public:
  std::unique_ptr<Acceptance> Begin() const override { return std::make_unique<Nested>(*this); }
  Negotiations *negotiations = nullptr;

private:
  class Nested final : public Acceptance {
  public:
    explicit Nested(const NestedAcceptor &acceptor) : m_acceptor(acceptor) {}
    AcceptedLeg Accept(const Leg &leg) override {
      if (leg == END) {
        m_acceptor.negotiations->Continue("c", GO_ON);
      }
      return {leg, std::nullopt};
    }

  private:
    const NestedAcceptor &m_acceptor;
  };
};

TEST(OpenNegotiation, TakesOneLegAtATime) {
  auto acceptor = std::make_unique<NestedAcceptor>();
  NestedAcceptor &seen = *acceptor;
  Negotiations negotiations(std::move(acceptor));
  seen.negotiations = &negotiations;
  negotiations.Begin("c", GO_ON, {});
  EXPECT_THROWS_MESSAGE(negotiations.Continue("c", END), Refusal, "a leg of that negotiation is being accepted");
}

} // namespace
} // namespace DevSts
