// SPDX-License-Identifier: Apache-2.0

#include "proof/replay_check.h"

#include "support/data_file.h"
#include "support/throws_message.h"
#include "unit/replay_guard/guarded_clock.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>

#include <gtest/gtest.h>

#include <set>
#include <stdexcept>
#include <string>

namespace {

using namespace SsoClient;
using ReplayGuardTest::SetClock;
using Tarvel::Ref;
using Tarvel::Crypto::VerifyingKey;
using Tarvel::System::DateTime;

Ref<const VerifyingKey> KeyOf(const std::string &name) {
  return Tarvel::Crypto::CreateVerifyingKey(
      Tarvel::Crypto::LoadCertificates(Testing::DataPath("crypto/" + name + ".crt")).front());
}

TEST(IdentifyMessage, DependsOnTheKindTheDigestAndTheKey) {
  const auto rsa = KeyOf("rsa2048");
  const auto ec = KeyOf("p256");
  const std::vector<std::uint8_t> digest(32, 1);
  const MessageIdentifier identifier = IdentifyMessage(SignedAs::SOAP_MESSAGE, digest, *rsa);
  EXPECT_EQ(identifier, IdentifyMessage(SignedAs::SOAP_MESSAGE, digest, *KeyOf("rsa2048")));
  const std::set<MessageIdentifier> all = {
      identifier, IdentifyMessage(SignedAs::HTTP_REQUEST, digest, *rsa),
      IdentifyMessage(SignedAs::SOAP_MESSAGE, digest, *ec),
      IdentifyMessage(SignedAs::SOAP_MESSAGE, std::vector<std::uint8_t>(32), *rsa),
      IdentifyMessage(SignedAs::SOAP_MESSAGE, std::vector<std::uint8_t>(48, 1), *rsa)};
  EXPECT_EQ(5u, all.size());
}

/// Answers what a test chooses.
class AnsweringGuard final : public ReplayGuard {
public:
  explicit AnsweringGuard(Answer answer) : m_answer(answer) {}

  Answer Remember(const MessageIdentifier &identifier, const DateTime &until) override {
    lastIdentifier = identifier;
    lastUntil = until;
    return m_answer;
  }

  MessageIdentifier lastIdentifier{};
  DateTime lastUntil;

private:
  Answer m_answer;
};

template <typename Thrown>
class ThrowingGuard final : public ReplayGuard {
public:
  explicit ThrowingGuard(Thrown thrown) : m_thrown(thrown) {}

  Answer Remember(const MessageIdentifier &, const DateTime &) override { throw m_thrown; }

private:
  Thrown m_thrown;
};

constexpr MessageIdentifier IDENTIFIER{1, 2, 3};
const DateTime UNTIL("2026-01-01T00:06:00Z");

/// Needs time for its answer: the clock then shows the time that the test chooses.
class SlowGuard final : public ReplayGuard {
public:
  SlowGuard(SetClock &clock, std::int64_t afterwards) : m_clock(clock), m_afterwards(afterwards) {}

  Answer Remember(const MessageIdentifier &, const DateTime &) override {
    m_clock.Set(m_afterwards);
    return Answer::FIRST;
  }

private:
  SetClock &m_clock;
  const std::int64_t m_afterwards;
};

TEST(RequireFirstReceipt, RefusesAMessageThatBecomesStaleBeforeTheGuardAnswers) {
  const std::int64_t until = UNTIL.GetUtcTime();
  SetClock clock(until - 2);
  for (const std::int64_t late : {until, until + 1}) {
    SlowGuard guard(clock, late);
    EXPECT_THROWS_MESSAGE(RequireFirstReceipt(guard, IDENTIFIER, UNTIL), StaleMessageException,
                          "The message became too old before the replay guard had answered");
  }
  SlowGuard inTime(clock, until - 1);
  EXPECT_NO_THROW(RequireFirstReceipt(inTime, IDENTIFIER, UNTIL));
}

TEST(RequireFirstReceipt, PassesTheIdentifierAndTheTimeToTheGuard) {
  const SetClock clock(UNTIL.GetUtcTime() - 1);
  AnsweringGuard guard(ReplayGuard::Answer::FIRST);
  RequireFirstReceipt(guard, IDENTIFIER, UNTIL);
  EXPECT_EQ(IDENTIFIER, guard.lastIdentifier);
  EXPECT_EQ(UNTIL, guard.lastUntil);
}

TEST(RequireFirstReceipt, RefusesRepeatedMessages) {
  AnsweringGuard guard(ReplayGuard::Answer::REPEATED);
  EXPECT_THROWS_MESSAGE(RequireFirstReceipt(guard, IDENTIFIER, UNTIL), RepeatedMessageException,
                        "The message was received before");
}

TEST(RequireFirstReceipt, RefusesIfTheGuardIsNotAvailable) {
  for (const auto answer : {ReplayGuard::Answer::UNAVAILABLE, static_cast<ReplayGuard::Answer>(7)}) {
    AnsweringGuard guard(answer);
    EXPECT_THROWS_MESSAGE(RequireFirstReceipt(guard, IDENTIFIER, UNTIL), ReplayGuardException,
                          "The replay guard is full or cannot be reached, so the message is refused");
  }
}

TEST(RequireFirstReceipt, RefusesIfTheGuardThrows) {
  ThrowingGuard standard(std::runtime_error("no connection"));
  EXPECT_THROWS_MESSAGE(RequireFirstReceipt(standard, IDENTIFIER, UNTIL), ReplayGuardException,
                        "The replay guard failed: no connection");
  ThrowingGuard number(7);
  EXPECT_THROWS_MESSAGE(RequireFirstReceipt(number, IDENTIFIER, UNTIL), ReplayGuardException,
                        "The replay guard failed");
}

} // namespace
