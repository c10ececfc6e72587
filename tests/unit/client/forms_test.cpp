// SPDX-License-Identifier: Apache-2.0
// The forms of each operation, over the real transport and over a scripted one.
#include "client_setup.h"
#include "support/scripted_server.h"
#include "support/soap_responses.h"

#include <gtest/gtest.h>

#include <chrono>
#include <future>
#include <memory>
#include <string>
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
  auto future = client->AcquireFuture(Alice(), SpecFor(60), options);
  EXPECT_TRUE(Testing::Eventually([&] { return stalling.GetOpenCount() == 1; }));
  source.Cancel();
  EXPECT_EQ(EndOf([&] { future.get(); }), Testing::CANCELLED);
  EXPECT_TRUE(Testing::Eventually([&] { return stalling.GetOpenCount() == 0; }));
}

} // namespace
} // namespace SsoClient
