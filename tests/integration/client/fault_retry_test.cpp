// SPDX-License-Identifier: Apache-2.0
// Which requests are sent again, and how often. The service and the resolver count them.

#include "integration/client/fault_service.h"
#include "support/operation_forms.h"
#include "support/process_resources.h"
#include "support/unavailable_port.h"
#include "system/name_lookup.h"

#include <gtest/gtest.h>

#include <boost/asio/ip/address_v4.hpp>

#include <atomic>
#include <chrono>
#include <memory>
#include <ostream>
#include <string>
#include <tuple>

namespace SsoClient {
namespace {

using namespace Testing;
using namespace std::chrono_literals;

constexpr int ATTEMPTS = 3;

/// A policy whose own delays are so short that only the service decides how long the client waits.
RetryPolicy Patient(int attempts = ATTEMPTS) {
  RetryPolicy policy;
  policy.attempts = attempts;
  policy.firstDelay = 1ms;
  policy.longestDelay = 2000ms;
  return policy;
}

CallOptions With(const RetryPolicy &policy) {
  CallOptions options;
  options.retryPolicy = policy;
  return options;
}

constexpr const char *DOWN = "CommunicationException: Server returned error: 503 Down";

constexpr const char *EMPTY =
    "SsoException: Response is not well-formed XML: the document is empty at line 1, column 1";

std::string Unavailable(const std::string &retryAfter) {
  return HttpResponse("503 Down", "", "Retry-After: " + retryAfter + "\r\n");
}

struct Answer {
  std::string name;
  std::string response;
  int requests; ///< how many the service receives
  std::string outcome;
};

void PrintTo(const Answer &answer, std::ostream *out) {
  *out << answer.name;
}

class RetryAfter : public testing::TestWithParam<std::tuple<Answer, bool>> {};

TEST_P(RetryAfter, DecidesHowOftenAnAnswerIsFollowedByAnotherRequest) {
  const auto &[answer, isSecure] = GetParam();
  FaultService service(Reply(answer.response), isSecure);
  const auto client = service.CreateClient();
  int before = 0;
  for (const Form form : AllForms()) {
    EXPECT_EQ(OutcomeOf([&] { return Acquire(form, *client, AnyCredential(), AnySpec(), With(Patient())); }),
              answer.outcome)
        << NameOf(form);
    const int connections = service.GetServer().GetConnectionCount();
    EXPECT_EQ(connections - before, answer.requests) << NameOf(form);
    before = connections;
  }
}

const Answer ANSWERS[] = {
    {"Zero", Unavailable("0"), ATTEMPTS, DOWN},
    {"APastDate", Unavailable("Sun, 06 Nov 1994 08:49:37 GMT"), ATTEMPTS, DOWN},
    {"AFarDate", Unavailable("Fri, 31 Dec 9999 23:59:59 GMT"), 1, DOWN},
    {"LongerThanTheLongestDelay", Unavailable("3"), 1, DOWN},
    {"Huge", Unavailable("99999999999999999999999999"), 1, DOWN},
    {"Negative", Unavailable("-1"), 1, DOWN},
    {"Signed", Unavailable("+0"), 1, DOWN},
    {"Fractional", Unavailable("0.5"), 1, DOWN},
    {"Hexadecimal", Unavailable("0x0"), 1, DOWN},
    {"Words", Unavailable("soon"), 1, DOWN},
    {"Empty", Unavailable(""), 1, DOWN},
    {"Missing", HttpResponse("503 Down", ""), 1, DOWN},
    {"OfAnotherStatus", HttpResponse("500 Internal Server Error", "", "Retry-After: 0\r\n"), 1, EMPTY},
    {"OfARedirect", HttpResponse("302 Found", "", "Retry-After: 0\r\n"), 1,
     "CommunicationException: Server returned error: 302 Found"},
    {"OfTooManyRequests", HttpResponse("429 Slow Down", "", "Retry-After: 0\r\n"), 1,
     "CommunicationException: Server returned error: 429 Slow Down"},
    {"OfASuccess", HttpResponse("200 OK", "", "Retry-After: 0\r\n"), 1, EMPTY},
};

INSTANTIATE_TEST_SUITE_P(Of, RetryAfter, testing::Combine(testing::ValuesIn(ANSWERS), testing::Bool()),
                         [](const testing::TestParamInfo<std::tuple<Answer, bool>> &test) {
                           return std::get<0>(test.param).name + (std::get<1>(test.param) ? "OverTls" : "OverTcp");
                         });

/// The first `unavailable` requests are answered with 503, and the others with a token.
ScriptedServer::Script AvailableAfter(int unavailable, const std::string &retryAfter) {
  const auto count = std::make_shared<std::atomic<int>>(0);
  return [=](ServerConnection &peer) {
    Reply((*count)++ < unavailable ? Unavailable(retryAfter) : TokenResponse())(peer);
  };
}

TEST(RetryPolicyOfAClient, TriesOnceByDefault) {
  FaultService service(AvailableAfter(1, "0"), false);
  const auto client = service.CreateClient();
  EXPECT_EQ(OutcomeOf([&] { return client->Acquire(AnyCredential(), AnySpec()); }), DOWN);
  EXPECT_EQ(service.GetServer().GetConnectionCount(), 1);
}

TEST(RetryPolicyOfAClient, ReachesAServiceThatIsAvailableAgain) {
  for (const Form form : AllForms()) {
    FaultService service(AvailableAfter(ATTEMPTS - 1, "0"), false);
    ClientOptions options;
    options.retryPolicy = Patient();
    const auto client = service.CreateClient(options);
    EXPECT_EQ(OutcomeOf([&] { return Acquire(form, *client, AnyCredential(), AnySpec()); }), "token") << NameOf(form);
    EXPECT_EQ(service.GetServer().GetConnectionCount(), ATTEMPTS) << NameOf(form);
  }
}

TEST(RetryPolicyOfAClient, IsReplacedByThePolicyOfTheCall) {
  FaultService service(AvailableAfter(1, "0"), false);
  ClientOptions options;
  options.retryPolicy = Patient();
  const auto client = service.CreateClient(options);
  EXPECT_EQ(OutcomeOf([&] { return client->Acquire(AnyCredential(), AnySpec(), With(Patient(1))); }), DOWN);
  EXPECT_EQ(service.GetServer().GetConnectionCount(), 1);
}

TEST(RetryPolicyOfAClient, WaitsAsLongAsTheServiceDemands) {
  FaultService service(AvailableAfter(1, "1"), false);
  const auto client = service.CreateClient();
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(OutcomeOf([&] { return client->Acquire(AnyCredential(), AnySpec(), With(Patient())); }), "token");
  EXPECT_GE(std::chrono::steady_clock::now() - start, 1s);
}

TEST(RetryPolicyOfAClient, EndsAtOnceWithTheFailureIfTheWaitIsLongerThanTheDeadline) {
  FaultService service(AvailableAfter(1, "1000000"), false);
  const auto client = service.CreateClient();
  RetryPolicy policy = Patient();
  policy.longestDelay = std::chrono::hours(10'000);
  CallOptions options = CallOptions::WithTimeout(100'000ms);
  options.retryPolicy = policy;
  EXPECT_EQ(OutcomeOf([&] { return client->Acquire(AnyCredential(), AnySpec(), options); }), DOWN);
  EXPECT_EQ(service.GetServer().GetConnectionCount(), 1);
}

TEST(RetryPolicyOfAClient, EndsItsWaitWhenTheOperationIsCancelled) {
  FaultService service(AvailableAfter(1, "1000000"), false);
  const auto client = service.CreateClient();
  const CancelSource source;
  RetryPolicy policy = Patient();
  policy.longestDelay = std::chrono::hours(10'000);
  CallOptions options = With(policy);
  options.cancelToken = source.GetToken();
  auto future = client->AcquireFuture(AnyCredential(), AnySpec(), options);
  ASSERT_TRUE(Eventually(
      [&] { return service.GetServer().GetConnectionCount() == 1 && service.GetServer().GetOpenCount() == 0; }));
  source.Cancel();
  EXPECT_EQ(OutcomeOf([&] { return Await(std::move(future)); }), CANCELLED);
  EXPECT_EQ(service.GetServer().GetConnectionCount(), 1);
}

TEST(RetryPolicyOfAClient, DoesNotRepeatARequestThatTheServiceMayHaveActedUpon) {
  const ScriptedServer::Script scripts[] = {
      Reply(""),
      [](ServerConnection &peer) {
        peer.ReadRequest();
        peer.Reset();
      },
      Reply("HTTP/1.1 503 Down\r\nRetry-Af"),
      Reply("this is not HTTP"),
      [](ServerConnection &peer) {
        peer.ReadSome(1);
        peer.Reset();
      },
  };
  for (const ScriptedServer::Script &script : scripts) {
    FaultService service(script, false);
    const auto client = service.CreateClient();
    const std::string outcome = OutcomeOf([&] { return client->Acquire(AnyCredential(), AnySpec(), With(Patient())); });
    EXPECT_EQ(outcome.substr(0, 24), "CommunicationException: ");
    EXPECT_EQ(service.GetServer().GetConnectionCount(), 1) << outcome;
  }
}

/// Counts the look-ups of names. There is one for each attempt to connect.
class RefusedConnection : public testing::Test {
protected:
  std::string Acquire(const TokenClient &client, const CallOptions &options) const {
    return OutcomeOf([&] { return client.Acquire(AnyCredential(), AnySpec(), options); });
  }

  const std::shared_ptr<std::atomic<int>> m_lookups = std::make_shared<std::atomic<int>>(0);
  const UnusedPort m_port;
  FaultService m_service{Reply(TokenResponse()), false};

private:
  const Tarvel::System::ScopedNameLookup m_lookup{[lookups = m_lookups](const std::string &) {
    ++*lookups;
    return Tarvel::System::AddressList{boost::asio::ip::address_v4::loopback()};
  }};
};

TEST_F(RefusedConnection, IsTriedAgain) {
  SecurityTokenServiceConfig config = m_service.GetConfig();
  config.stsUrl = "http://sts.example:" + std::to_string(m_port.GetPort()) + "/sts";
  const TokenClient client(config);
  const std::string once = Acquire(client, {});
  EXPECT_EQ(once.substr(0, 24), "CommunicationException: ");
  EXPECT_EQ(*m_lookups, 1);
  EXPECT_EQ(Acquire(client, With(Patient())), once);
  EXPECT_EQ(*m_lookups, 1 + ATTEMPTS);
}

} // namespace
} // namespace SsoClient
