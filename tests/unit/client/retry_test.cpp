// SPDX-License-Identifier: Apache-2.0

#include "client/retry.h"

#include "client_setup.h"
#include "stepped_time.h"
#include "support/throws_message.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <chrono>
#include <limits>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using std::chrono::milliseconds;
using Testing::Alice;
using Testing::ClientOn;
using Testing::ClientParts;
using Testing::NoConnection;
using Testing::Outcomes;
using Testing::Reply;
using Testing::ScriptedTransport;
using Testing::SpecFor;
using Testing::SteppedTime;
using Testing::Unavailable;
using Strings = std::vector<std::string>;

const auto NOW = std::chrono::system_clock::time_point(std::chrono::seconds(784111777)); // 1994-11-06 08:49:37

RetryPolicy PolicyOf(int attempts) {
  RetryPolicy policy;
  policy.attempts = attempts;
  policy.firstDelay = milliseconds(200);
  policy.longestDelay = milliseconds(1000);
  return policy;
}

/// The delay in milliseconds; -1 if there is no further attempt.
std::int64_t DelayAfter(int attempt, const Reply &reply, double random = 1.0, int attempts = 10) {
  const auto delay = GetRetryDelay(PolicyOf(attempts), attempt, reply.facts, NOW, random);
  return delay ? delay->count() : -1;
}

std::int64_t RetryAfter(const std::string &value) {
  const auto time = ReadRetryAfter(value, NOW);
  return time ? time->count() : -1;
}

TEST(ReadRetryAfter, ReadsSecondsAndDates) {
  EXPECT_EQ(RetryAfter("0"), 0);
  EXPECT_EQ(RetryAfter("120"), 120'000);
  EXPECT_EQ(RetryAfter("Sun, 06 Nov 1994 08:49:40 GMT"), 3'000);
  EXPECT_EQ(RetryAfter("Sun, 06 Nov 1994 08:49:00 GMT"), 0);
  EXPECT_EQ(RetryAfter("99999999999999999999"), milliseconds::max().count());
}

TEST(ReadRetryAfter, RefusesEverythingElse) {
  for (const char *const value : {"", "-1", "soon", "1.5", " 1", "1 "}) {
    EXPECT_EQ(RetryAfter(value), -1) << value;
  }
}

TEST(GetRetryDelay, DoublesTheDelayUpToTheLongest) {
  EXPECT_EQ(DelayAfter(1, NoConnection()), 200);
  EXPECT_EQ(DelayAfter(2, NoConnection()), 400);
  EXPECT_EQ(DelayAfter(3, NoConnection()), 800);
  EXPECT_EQ(DelayAfter(4, NoConnection()), 1000);
  EXPECT_EQ(DelayAfter(9, NoConnection()), 1000);
}

TEST(GetRetryDelay, SubtractsUpToAHalfAtRandom) {
  EXPECT_EQ(DelayAfter(2, NoConnection(), 0.0), 200);
  EXPECT_EQ(DelayAfter(2, NoConnection(), 0.5), 300);
}

TEST(GetRetryDelay, EndsWithTheLastAttempt) {
  EXPECT_EQ(DelayAfter(3, NoConnection(), 1.0, 3), -1);
  EXPECT_EQ(DelayAfter(1, NoConnection(), 1.0, 1), -1);
}

TEST(GetRetryDelay, DoesNotOverflowWithTheLargestPolicy) {
  RetryPolicy policy;
  policy.attempts = std::numeric_limits<int>::max();
  policy.longestDelay = policy.firstDelay = milliseconds::max() / 4;
  EXPECT_GT(GetRetryDelay(policy, 1'000'000'000, NoConnection().facts, NOW, 0.0)->count(), 0);
  policy.firstDelay = milliseconds(0);
  EXPECT_EQ(GetRetryDelay(policy, 1'000'000'000, NoConnection().facts, NOW, 0.0)->count(), 0);
}

TEST(GetRetryDelay, IsAtMostAYearWithTheLargestPolicy) {
  RetryPolicy policy;
  policy.attempts = 2;
  policy.longestDelay = policy.firstDelay = milliseconds::max();
  const auto delayAfter = [&policy](const Reply &reply) {
    const auto delay = GetRetryDelay(policy, 1, reply.facts, NOW, 1.0);
    return delay ? delay->count() : -1;
  };
  constexpr std::int64_t YEAR = milliseconds(std::chrono::hours(24 * 365)).count();
  EXPECT_EQ(delayAfter(NoConnection()), YEAR);
  EXPECT_EQ(delayAfter(Unavailable("0")), YEAR);
  EXPECT_EQ(delayAfter(Unavailable("9999999999")), -1);
}

TEST(GetRetryDelay, RepeatsARefusalOnlyWithRetryAfterAndNeverBeforeThatTime) {
  EXPECT_EQ(DelayAfter(1, Unavailable("0"), 1.0), 200);
  EXPECT_EQ(DelayAfter(1, Unavailable("1"), 0.0), 1000);
  EXPECT_EQ(DelayAfter(1, Unavailable("")), -1);
  EXPECT_EQ(DelayAfter(1, Unavailable("2")), -1) << "longer than the longest delay";
}

TEST(GetRetryDelay, DoesNotRepeatWhatTheServiceMayHaveActedUpon) {
  Reply reply = NoConnection();
  reply.facts.hasConnected = true;
  EXPECT_EQ(DelayAfter(1, reply), -1);
  for (const int status : {400, 429, 500, 502, 504}) {
    reply.facts.status = status;
    reply.facts.retryAfter = "0";
    EXPECT_EQ(DelayAfter(1, reply), -1) << status;
  }
}

TEST(RetryPolicy, IsRefusedWithoutAttemptsAndWithNegativeDelays) {
  ClientParts parts;
  parts.options.retryPolicy.attempts = 0;
  const auto transport = std::make_shared<ScriptedTransport>(Testing::Issue);
  EXPECT_EQ(Testing::EndOf([&] { ClientOn(transport, parts); }),
            "InvalidArgumentException: Invalid argument : RetryPolicy::attempts must be at least 1");
  const auto client = ClientOn(transport);
  CallOptions options;
  options.retryPolicy = RetryPolicy();
  options.retryPolicy->firstDelay = milliseconds(-1);
  EXPECT_EQ(Testing::EndOf([&] { client->Acquire(Alice(), SpecFor(60), options); }),
            "InvalidArgumentException: Invalid argument : RetryPolicy: a delay may not be negative");
  EXPECT_EQ(transport->Sent(), Strings());
}

/// A client that fails with the replies of a script, one after the other, and then succeeds.
class RetryingClient : public testing::Test {
protected:
  void Start(const std::vector<Reply> &replies, int attempts, const CallOptions &callOptions = {},
             const Credential &credential = Alice()) {
    transport = std::make_shared<ScriptedTransport>([replies](const Request &, int number) {
      const auto index = static_cast<std::size_t>(number) - 1;
      return boost::make_optional(index < replies.size() ? replies[index]
                                                         : Testing::Success("issued:" + Testing::BearerXml()));
    });
    ClientParts parts;
    parts.time = &time;
    parts.options.retryPolicy = PolicyOf(attempts);
    client = ClientOn(transport, parts);
    client->AcquireAsync(credential, SpecFor(60), callOptions, outcomes.Record());
  }
  /// Waits until the client waits for its next attempt. The timer of the request that has failed is cancelled before
  /// the session is released, so the timer that exists after that is the one of the next attempt.
  void WaitForNextAttempt() {
    EXPECT_TRUE(Testing::Eventually([&] { return transport->CountOpenSessions() == 0 && time.CountTimers() == 1; }));
  }
  /// Does the same, and lets time pass.
  void Pass(milliseconds delay) {
    WaitForNextAttempt();
    time.Advance(delay);
  }

  SteppedTime time; // outlives the client
  std::shared_ptr<ScriptedTransport> transport;
  std::shared_ptr<TokenClient> client;
  Outcomes outcomes;
};

constexpr const char *SUBJECT = "{Name: alice; Domain:corp.example}";

TEST_F(RetryingClient, RepeatsTheRequestAfterItsDelayInANewSession) {
  Start({NoConnection(), Unavailable("1")}, 3);
  transport->WaitForSent(1);
  Pass(milliseconds(200));
  transport->WaitForSent(2);
  WaitForNextAttempt();
  time.Advance(milliseconds(999));
  EXPECT_EQ(transport->Sent().size(), 2u);
  time.Advance(milliseconds(201));
  EXPECT_EQ(outcomes.Wait(), Strings{SUBJECT});
  EXPECT_EQ(transport->Sent(),
            (Strings{"1: UserPass alice secret 60", "2: UserPass alice secret 60", "3: UserPass alice secret 60"}));
}

TEST_F(RetryingClient, EndsWithTheLastFailureAfterTheLastAttempt) {
  Start({NoConnection(), Unavailable("0")}, 2);
  transport->WaitForSent(1);
  Pass(milliseconds(1000));
  EXPECT_EQ(outcomes.Wait(), Strings{"CommunicationException: Server returned error: 503 Busy"});
}

TEST_F(RetryingClient, NeverRepeatsByDefault) {
  Start({NoConnection()}, 1);
  EXPECT_EQ(outcomes.Wait(), Strings{"CommunicationException: Cannot connect to sts.test:443"});
  EXPECT_EQ(transport->Sent().size(), 1u);
}

TEST_F(RetryingClient, DoesNotRepeatARefusalOfTheService) {
  Start({Testing::Success("fault:refused")}, 3);
  EXPECT_EQ(outcomes.Wait(), Strings{"InvalidCredentialsException: refused"});
  EXPECT_EQ(transport->Sent().size(), 1u);
}

TEST_F(RetryingClient, EndsAtOnceWhenTheDeadlineWouldPassDuringTheWait) {
  CallOptions options;
  options.deadline = time.GetSteadyTime() + milliseconds(100); // every delay is at least as long
  Start({NoConnection()}, 3, options);
  EXPECT_EQ(outcomes.Wait(), Strings{"CommunicationException: Cannot connect to sts.test:443"});
}

TEST_F(RetryingClient, IsCancelledDuringTheWait) {
  const CancelSource source;
  CallOptions options;
  options.cancelToken = source.GetToken();
  Start({NoConnection()}, 3, options);
  transport->WaitForSent(1);
  WaitForNextAttempt();
  source.Cancel();
  EXPECT_EQ(outcomes.Wait(), Strings{Testing::CANCELLED});
  // The step that has started the timer cancels it if the operation was cancelled at that moment.
  EXPECT_TRUE(Testing::Eventually([&] { return time.CountTimers() == 0; }));
}

TEST_F(RetryingClient, MakesANewHandlerForEachAttempt) {
  const auto made = std::make_shared<std::atomic<int>>(0);
  NegotiationCredential credential;
  credential.makeHandler = [made] {
    ++*made;
    return std::make_shared<Testing::NegotiationHandlerStandIn>(
        std::vector<std::shared_ptr<Testing::Bytes>>{Testing::Leg("one"), Testing::Leg("two")});
  };
  Start({NoConnection(), Testing::Success("leg:ctx||" + Testing::BearerXml())}, 2, {}, credential);
  transport->WaitForSent(1);
  Pass(milliseconds(200));
  EXPECT_EQ(outcomes.Wait(), Strings{SUBJECT});
  EXPECT_EQ(*made, 2);
  EXPECT_EQ(transport->Sent(), (Strings{"1: InitialSPNego 60 one", "2: InitialSPNego 60 one"}));
}

TEST_F(RetryingClient, DoesNotRepeatALaterLeg) {
  NegotiationCredential credential;
  credential.makeHandler = [] {
    return std::make_shared<Testing::NegotiationHandlerStandIn>(
        std::vector<std::shared_ptr<Testing::Bytes>>{Testing::Leg("one"), Testing::Leg("two")});
  };
  Start({Testing::Success("leg:ctx|go on|"), NoConnection()}, 3, {}, credential);
  EXPECT_EQ(outcomes.Wait(), Strings{"CommunicationException: Cannot connect to sts.test:443"});
  EXPECT_EQ(transport->Sent().size(), 2u);
}

} // namespace
} // namespace SsoClient
