// SPDX-License-Identifier: Apache-2.0
// Many clients at once, and clients that never complete a request.

#include "messages.h"

#include <deque>
#include <thread>

#include <unistd.h>

namespace DevStsTest {
namespace {

/// A client that sends all of its requests on one connection.
class SteadyClient {
public:
  explicit SteadyClient(const Testing::DevSts &service)
      : m_service(service), m_signing(BuilderFor(service, "client")), m_connection(service) {}

  /// Sends one request of each kind, and checks the answers of a strict service.
  void RunOnce() {
    EXPECT_TRUE(IsIssued(Ask(PasswordRequest())));
    EXPECT_TRUE(IsRefused(Ask(PasswordRequest("bob@corp.example", "wonderland")), "wst:FailedAuthentication",
                          "unknown user or wrong password"));
    SsoClient::Request request;
    m_signing.BuildCertificateTokenRequest(RenewableSpec(), request);
    const Testing::TokenStandIn token = TokenIn(Ask(request));
    m_signing.BuildRenewRequest(token, 60, request = {});
    EXPECT_TRUE(IsIssued(Ask(request)));
    m_signing.BuildExchangeTokenRequest(token, PlainSpec(), request = {});
    EXPECT_TRUE(IsIssued(Ask(request)));
    BuilderFor(m_service, "").BuildValidateSubjectRequest(token, request = {});
    EXPECT_NE(Ask(request).body.find("/status/valid<"), std::string::npos);
    request.body.resize(request.body.size() / 2);
    EXPECT_TRUE(IsRefused(Ask(request), "soapenv:Client", "the message is not well-formed XML"));
  }

private:
  HttpAnswer Ask(const SsoClient::Request &request) {
    m_connection.Send(PostBytes(request.soapAction, request.body));
    return m_connection.Receive();
  }

  const Testing::DevSts &m_service;
  const SsoClient::RequestBuilderImpl m_signing;
  TlsClient m_connection;
};

TEST(Clients, AreServedAtOnceEvenWhenThereAreMany) {
  constexpr int CLIENTS = 16;
  constexpr int ROUNDS = 10;
  Testing::DevSts service;
  std::vector<std::thread> threads;
  for (int i = 0; i < CLIENTS; ++i) {
    threads.emplace_back([&service] {
      SteadyClient client(service);
      for (int round = 0; round < ROUNDS; ++round) {
        client.RunOnce();
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(service.End(SIGTERM).exitCode, 0);
}

TEST(Clients, WithoutTlsAreDisconnected) {
  Testing::DevSts service;
  RawConnection client(service);
  client.Send("POST /sts HTTP/1.1\r\nHost: localhost\r\n\r\n");
  EXPECT_TRUE(client.IsEnded());
  EXPECT_TRUE(IsIssued(Send(service, PasswordRequest())));
  EXPECT_NE(service.GetLog().find(": handshake failed: http request (SSL routines)\n"), std::string::npos)
      << service.GetLog();
}

TEST(Clients, ThatSendNothingDoNotDelayOthers) {
  Testing::DevSts service;
  std::deque<RawConnection> silent;
  std::deque<TlsClient> slow;
  for (int i = 0; i < 50; ++i) {
    silent.emplace_back(service);
    slow.emplace_back(service).Send("POST /sts HTTP/1.1\r\nContent-Length: 10\r\n");
  }
  EXPECT_TRUE(IsIssued(Send(service, PasswordRequest())));
  EXPECT_EQ(service.End(SIGTERM).exitCode, 0);
}

} // namespace
} // namespace DevStsTest
