// SPDX-License-Identifier: Apache-2.0
// One time-out covers everything from the connect to the last byte, and leaks nothing.

#include "integration/transport/service_stand_in.h"
#include "support/completion.h"
#include "system/name_lookup.h"

#include <gtest/gtest.h>

#include <future>
#include <limits>
#include <memory>
#include <optional>
#include <ostream>
#include <string>
#include <thread>

namespace SsoClient {
namespace {

using Testing::AskForOutcome;
using Testing::CountConnectionsTo;
using Testing::CountDescriptors;
using Testing::CountThreads;
using Testing::Eventually;
using Testing::Failure;
using Testing::FaultThenAnswer;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::ServiceStandIn;
using Testing::Stopwatch;
using Testing::TlsSettings;

constexpr std::int64_t SHORT = 300000; // microseconds
constexpr std::chrono::milliseconds AT_LEAST{290};
constexpr std::chrono::seconds AT_MOST{20}; // on a busy machine, under a sanitizer

struct Delay {
  std::string name;
  bool tls;
  ScriptedServer::Script script;
};

void PrintTo(const Delay &delay, std::ostream *out) {
  *out << delay.name;
}

const std::string START = "HTTP/1.1 200 OK\r\nContent-Length: 500000\r\n\r\n";

ScriptedServer::Script StallAfter(const std::string &bytes) {
  return [bytes](ServerConnection &connection) {
    connection.Handshake();
    connection.ReadRequest();
    connection.Write(bytes);
    connection.Stall();
  };
}

/// Sends one byte at a time, each well within the time-out.
ScriptedServer::Script Drip(const std::string &bytes) {
  return [bytes](ServerConnection &connection) {
    connection.Handshake();
    connection.ReadRequest();
    for (const char c : bytes) {
      if (!connection.Write({&c, 1})) {
        return;
      }
      std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
  };
}

std::string NameOf(const testing::TestParamInfo<Delay> &info) {
  return info.param.name;
}

/// May need more than one request, because the time-out is short for a busy machine.
bool WorksAgain(TransportSession &session) {
  return Eventually([&session] { return AskForOutcome(session) == "<after/>"; });
}

class TransportTimeoutOfAService : public testing::TestWithParam<Delay> {};

TEST_P(TransportTimeoutOfAService, EndsTheRequestInTimeAndLeaksNothing) {
  ServiceStandIn service(FaultThenAnswer(GetParam().script),
                         GetParam().tls ? std::optional(TlsSettings()) : std::nullopt, SHORT);
  const auto session = service.CreateSession();
  const Stopwatch stopwatch;
  EXPECT_EQ(AskForOutcome(*session, Testing::SampleRequest(std::string(4 * 1024 * 1024, 'x'))),
            Failure("No response from " + service.GetEndpoint() + " within 0.3 seconds"));
  EXPECT_GE(stopwatch.Read(), AT_LEAST);
  EXPECT_LT(stopwatch.Read(), AT_MOST);
  EXPECT_EQ(CountConnectionsTo(service.GetServer().GetPort()), 0u);
  EXPECT_TRUE(WorksAgain(*session));
}

const std::string DRIPPED = "HTTP/1.1 200 OK\r\nContent-Length: 500\r\n\r\n" + std::string(500, 'x');

INSTANTIATE_TEST_SUITE_P(Delays, TransportTimeoutOfAService,
                         testing::Values(Delay{"StallBeforeTheHandshakeEnds", true,
                                               [](ServerConnection &connection) { connection.Stall(); }},
                                         Delay{"StallBeforeTheRequestIsRead", false,
                                               [](ServerConnection &connection) { connection.WaitForInterrupt(); }},
                                         Delay{"StallBeforeTheRequestIsReadOverTls", true,
                                               [](ServerConnection &connection) {
                                                 connection.Handshake();
                                                 connection.WaitForInterrupt();
                                               }},
                                         Delay{"StallBeforeTheHeader", false, StallAfter("")},
                                         Delay{"StallBeforeTheHeaderOverTls", true, StallAfter("")},
                                         Delay{"StallWithinTheHeader", false, StallAfter("HTTP/1.1 200 OK\r\nA")},
                                         Delay{"StallAfterTheHeader", false, StallAfter(START)},
                                         Delay{"StallWithinTheBody", true, StallAfter(START + "hello")},
                                         Delay{"Drip", false, Drip(DRIPPED)},
                                         Delay{"DripOverTls", true, Drip(DRIPPED)}),
                         NameOf);

TEST(TransportTimeout, EndsAConnectInTimeAndLeaksNothing) {
  Testing::FullPort full;
  const std::string endpoint = "127.0.0.1:" + std::to_string(full.GetPort());
  const HttpsClient client("http://" + endpoint, nullptr, "", SHORT);
  AskForOutcome(*client.CreateSession()); // the first request of the process starts the I/O threads, which stay
  ASSERT_TRUE(Testing::DrainIoThreads());
  const std::size_t descriptors = CountDescriptors();
  const Stopwatch stopwatch;
  const auto session = client.CreateSession();
  EXPECT_EQ(AskForOutcome(*session), Failure("No response from " + endpoint + " within 0.3 seconds"));
  EXPECT_LT(stopwatch.Read(), AT_MOST);
  EXPECT_EQ(CountDescriptors(), descriptors);

  full.Empty();
  std::thread server([&full] { full.AnswerAll(Testing::Response("200 OK", "<after/>")); });
  EXPECT_TRUE(WorksAgain(*session));
  full.StopAnswering();
  server.join();
}

TEST(TransportTimeout, EndsALookupInTime) {
  // No other test uses this name: its connection would join the look-up, which may end after this test.
  const std::string host = "never-found.example";
  const auto release = std::make_shared<std::promise<void>>();
  const auto released = std::make_shared<std::shared_future<void>>(release->get_future());
  const Tarvel::System::ScopedNameLookup lookup([released](const std::string &) {
    released->wait();
    return Tarvel::System::AddressList();
  });
  const HttpsClient client("https://" + host + "/", Testing::CreateTrustingContext(), "", SHORT);
  const Stopwatch stopwatch;
  EXPECT_EQ(AskForOutcome(*client.CreateSession()), Failure("No response from " + host + ":443 within 0.3 seconds"));
  EXPECT_LT(stopwatch.Read(), AT_MOST);
  release->set_value();
}

TEST(TransportTimeout, EndsTheRequestAtOnceWhenItIsTinyOrNotPositive) {
  for (const std::int64_t timeout : {std::int64_t(0), std::int64_t(-1), std::int64_t(1)}) {
    ServiceStandIn service([](ServerConnection &connection) { connection.Stall(); }, std::nullopt, timeout);
    const std::string outcome = AskForOutcome(*service.CreateSession());
    EXPECT_EQ(outcome, Failure("No response from " + service.GetEndpoint() + " within " +
                               (timeout == 1 ? "0.000001 seconds" : "0 seconds")));
  }
}

TEST(TransportTimeout, DoesNotOverflow) {
  ServiceStandIn service(Testing::AnswerWith(Testing::Response("200 OK", "<body/>")), std::nullopt,
                         std::numeric_limits<std::int64_t>::max());
  EXPECT_EQ(AskForOutcome(*service.CreateSession()), "<body/>");
}

TEST(TransportTimeout, LeaksNoDescriptorAndNoThreadWhenRepeated) {
  constexpr std::int64_t VERY_SHORT = 10000; // microseconds
  ServiceStandIn service([](ServerConnection &connection) { connection.Stall(); }, TlsSettings(), VERY_SHORT);
  AskForOutcome(*service.CreateSession()); // starts all threads that later requests use
  const auto isQuiet = [&] { return service.GetServer().GetOpenCount() == 0; };
  ASSERT_TRUE(Eventually(isQuiet));
  ASSERT_TRUE(Eventually([&] { return CountConnectionsTo(service.GetServer().GetPort()) == 0; }));
  const std::size_t descriptors = CountDescriptors();
  const std::size_t threads = CountThreads();
  for (int i = 0; i < 40; ++i) {
    AskForOutcome(*service.CreateSession());
  }
  EXPECT_TRUE(Eventually(isQuiet));
  EXPECT_TRUE(Eventually([&] { return CountDescriptors() <= descriptors; })) << CountDescriptors() << descriptors;
  EXPECT_TRUE(Eventually([&] { return CountThreads() <= threads; })) << CountThreads() << threads;
}

} // namespace
} // namespace SsoClient
