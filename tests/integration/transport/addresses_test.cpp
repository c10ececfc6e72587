// SPDX-License-Identifier: Apache-2.0
// How a service is reached: by name and by address, over both versions of IP.

#include "integration/transport/service_stand_in.h"
#include "system/name_lookup.h"

#include <gtest/gtest.h>

#include <mutex>
#include <optional>
#include <string>

namespace SsoClient {
namespace {

using Tarvel::System::AddressList;
using Tarvel::System::NetworkException;
using Tarvel::System::ScopedNameLookup;
using Testing::AskForOutcome;
using Testing::CreateTrustingContext;
using Testing::Failure;
using Testing::NO_TIMEOUT;
using Testing::Response;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsSettings;

/// Answers with the Host header of the request.
void TellHost(ServerConnection &connection) {
  if (connection.Handshake()) {
    const std::string request = connection.ReadRequest();
    const std::size_t start = request.find("\r\nHost: ") + 8;
    connection.Write(Response("200 OK", request.substr(start, request.find('\r', start) - start)));
  }
}

std::string AskHost(const std::string &authority, bool tls = false) {
  const HttpsClient client((tls ? "https://" : "http://") + authority + "/", tls ? CreateTrustingContext() : nullptr,
                           "", NO_TIMEOUT);
  return AskForOutcome(*client.CreateSession());
}

TEST(TransportAddresses, ReachAServiceByNameAndByAddress) {
  for (const bool tls : {false, true}) {
    const auto settings = tls ? std::optional(TlsSettings()) : std::nullopt;
    ScriptedServer v4(TellHost, settings);
    ScriptedServer v6(TellHost, settings, true);
    const std::string port4 = ":" + std::to_string(v4.GetPort());
    const std::string port6 = ":" + std::to_string(v6.GetPort());
    EXPECT_EQ(AskHost("localhost" + port4, tls), "localhost" + port4);
    EXPECT_EQ(AskHost("LocalHost" + port4, tls), "LocalHost" + port4);
    EXPECT_EQ(AskHost("127.0.0.1" + port4, tls), "127.0.0.1" + port4);
    EXPECT_EQ(AskHost("[::1]" + port6, tls), "[::1]" + port6);
  }
}

TEST(TransportAddresses, TryTheNextOneOfAName) {
  ScriptedServer server(TellHost);
  const std::string authority = "two.example:" + std::to_string(server.GetPort());
  const ScopedNameLookup lookup([](const std::string &) {
    return AddressList{boost::asio::ip::make_address("::1"), boost::asio::ip::make_address("127.0.0.1")};
  });
  EXPECT_EQ(AskHost(authority), authority);
}

TEST(TransportAddresses, AreAllNamedWhenNoneAnswers) {
  const Testing::UnusedPort unused;
  const std::string authority = "two.example:" + std::to_string(unused.GetPort());
  const ScopedNameLookup lookup([](const std::string &) {
    return AddressList{boost::asio::ip::make_address("::1"), boost::asio::ip::make_address("127.0.0.1")};
  });
  EXPECT_EQ(AskHost(authority),
            Failure("Cannot connect to " + authority + ": ::1: Connection refused; 127.0.0.1: Connection refused"));
}

TEST(TransportAddresses, OfAnUnknownHostAreAFailure) {
  const ScopedNameLookup lookup(
      [](const std::string &) -> AddressList { throw NetworkException("Name or service not known"); });
  EXPECT_EQ(AskHost("sts.example"), Failure("Cannot connect to sts.example:80: Name or service not known"));
  EXPECT_EQ(AskHost("sts.example", true), Failure("Cannot connect to sts.example:443: Name or service not known"));
}

} // namespace
} // namespace SsoClient
