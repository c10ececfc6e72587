// SPDX-License-Identifier: Apache-2.0

#include "ssl/session_cache.h"
#include "ssl/ssl_context_impl.h"
#include "support/process_resources.h"
#include "unit/tarvel_ssl/tls_client.h"

#include <gtest/gtest.h>

#include <openssl/ssl.h>

#include <cstddef>
#include <string>

namespace Tarvel::Ssl {
namespace {

using Testing::CreateTrustingContext;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsCertificate;
using Testing::TlsClient;
using Testing::TlsSettings;

/// Sends to the client what kind of handshake the server has made: "resumed" or "full".
void ReportWhetherResumed(ServerConnection &connection) {
  if (connection.Handshake()) {
    connection.Write(connection.WasResumed() ? "resumed" : "full");
    connection.ReadSome();
  }
}

class SessionResumption : public testing::TestWithParam<int> {
protected:
  TlsSettings Settings() const {
    TlsSettings settings;
    settings.minimumVersion = settings.maximumVersion = GetParam();
    return settings;
  }

  /// "full" or "resumed", on which both sides must agree; or the message of a failure.
  std::string Connect(const std::string &host = "localhost", const std::string &parameter = "") {
    TlsClient client(m_context, m_server.GetPort());
    if (const std::string failure = client.Handshake(host, parameter); !failure.empty()) {
      return failure;
    }
    std::string reported = client.Read();
    EXPECT_EQ(client.GetStream()->WasResumed(), reported == "resumed");
    client.GetStream()->Close();
    return reported;
  }

  std::size_t CountSessions() const { return dynamic_cast<SSLContextImpl &>(*m_context).GetSessions().GetSize(); }

  const Ref<SSLContext> m_context = CreateTrustingContext();
  ScriptedServer m_server{ReportWhetherResumed, Settings()};
};

TEST_P(SessionResumption, ResumesTheSecondAndAllLaterConnections) {
  EXPECT_EQ(Connect(), "full");
  for (int i = 0; i < 5; ++i) {
    EXPECT_EQ(Connect(), "resumed") << i;
  }
}

TEST_P(SessionResumption, ResumesTheSessionOfAConnectionThatWasOnlyReleased) {
  {
    TlsClient client(m_context, m_server.GetPort());
    ASSERT_EQ(client.Handshake(), "");
    ASSERT_EQ(client.Read(), "full");
  }
  EXPECT_TRUE(Testing::Eventually([this] { return CountSessions() > 0; })); // an I/O thread may still have a reference
  EXPECT_EQ(Connect(), "resumed");
}

// OpenSSL modifies and copies the session of an open connection without a lock.
TEST_P(SessionResumption, ResumesASessionOnlyAfterItsConnectionHasEnded) {
  TlsClient first(m_context, m_server.GetPort());
  ASSERT_EQ(first.Handshake(), "");
  ASSERT_EQ(first.Read(), "full");
  TlsClient second(m_context, m_server.GetPort());
  ASSERT_EQ(second.Handshake(), "");
  EXPECT_EQ(second.Read(), "full");
  EXPECT_EQ(CountSessions(), 0u);
  first.GetStream()->Close();
  EXPECT_GT(CountSessions(), 0u);
  TlsClient third(m_context, m_server.GetPort());
  ASSERT_EQ(third.Handshake(), "");
  EXPECT_EQ(third.Read(), "resumed");
}

TEST_P(SessionResumption, ResumesNoSessionAfterAFatalAlert) {
  ScriptedServer corrupting(
      [](ServerConnection &connection) {
        if (connection.Handshake() && connection.Write("full")) {
          connection.WriteRaw(std::string("\x17\x03\x03\x00\x20", 5) + std::string(32, 'x'));
          connection.ReadSome();
        }
      },
      Settings());
  TlsClient client(m_context, corrupting.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  ASSERT_EQ(client.Read(), "full");
  client.Read();
  EXPECT_TRUE(client.HasFailed());
  client.GetStream()->Close();
  EXPECT_EQ(CountSessions(), 0u);
}

TEST_P(SessionResumption, KeepsSeparateSessionsForEachHostName) {
  EXPECT_EQ(Connect("localhost"), "full");
  EXPECT_EQ(Connect("127.0.0.1"), "full");
  EXPECT_EQ(Connect("other.example"),
            "The TLS handshake with other.example failed: the server's certificate was not accepted: hostname mismatch "
            "(certificate \"CN=localhost\")");
  EXPECT_EQ(Connect("LOCALHOST"), "resumed");
  EXPECT_EQ(Connect("127.0.0.1"), "resumed");
}

TEST_P(SessionResumption, KeepsSeparateSessionsForEachThumbprint) {
  const std::string right = TlsCertificate("localhost")->GetSha256Thumbprint();
  const std::string wrong = TlsCertificate("expired")->GetSha256Thumbprint();
  EXPECT_EQ(Connect("other.example", right), "full");
  EXPECT_EQ(Connect("other.example", right), "resumed");
  // A connection whose name must be checked must not resume a session whose name was not checked.
  EXPECT_NE(Connect("other.example"), "resumed");
  EXPECT_EQ(Connect("localhost"), "full");
  EXPECT_EQ(Connect("localhost"), "resumed");
  EXPECT_EQ(Connect("localhost", wrong),
            "The TLS handshake with localhost failed: the server's certificate has the SHA-256 thumbprint " + right +
                " instead of " + wrong);
  EXPECT_EQ(Connect("localhost", right), "full");
  EXPECT_EQ(Connect("localhost", right), "resumed");
}

TEST_P(SessionResumption, DoesNotShareSessionsBetweenContexts) {
  EXPECT_EQ(Connect(), "full");
  TlsClient client(CreateTrustingContext(), m_server.GetPort());
  EXPECT_EQ(client.Handshake(), "");
  EXPECT_EQ(client.Read(), "full");
}

TEST_P(SessionResumption, ForgetsSessionsWhenTrustChanges) {
  EXPECT_EQ(Connect(), "full");
  m_context->TrustCertificates({TlsCertificate("unknown-authority")});
  EXPECT_EQ(Connect(), "full");
}

TEST_P(SessionResumption, MakesAFullHandshakeWithAServerThatForgotTheSession) {
  TlsSettings settings = Settings();
  settings.resumesSessions = false;
  ScriptedServer forgetful(ReportWhetherResumed, settings);
  for (int i = 0; i < 3; ++i) {
    TlsClient client(m_context, forgetful.GetPort());
    EXPECT_EQ(client.Handshake(), "");
    EXPECT_EQ(client.Read(), "full");
    client.GetStream()->Close();
  }
}

INSTANTIATE_TEST_SUITE_P(Versions, SessionResumption, testing::Values(TLS1_2_VERSION, TLS1_3_VERSION),
                         [](const auto &version) { return version.param == TLS1_2_VERSION ? "TLS12" : "TLS13"; });

TEST(SSLStream, KeepsAtMostEightSessions) {
  TlsSettings settings;
  settings.tickets = 100;
  ScriptedServer server(ReportWhetherResumed, settings);
  const Ref<SSLContext> context = CreateTrustingContext();
  TlsClient client(context, server.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  EXPECT_EQ(client.Read(), "full");
  client.GetStream()->Close();
  EXPECT_EQ(dynamic_cast<SSLContextImpl &>(*context).GetSessions().GetSize(), 8u);
}

TEST(SessionCache, ForgetsASessionThatIsNotResumable) {
  SessionCache cache;
  cache.Put("key", SessionHandle(SSL_SESSION_new())); // no identifier, no ticket, no certificate
  EXPECT_FALSE(cache.Take("key"));
  EXPECT_FALSE(cache.Take("key"));
}

TEST(SessionCache, IsBounded) {
  SessionCache cache;
  for (int i = 0; i < 5000; ++i) {
    cache.Put("key" + std::to_string(i % 100), SessionHandle(SSL_SESSION_new()));
  }
  EXPECT_LE(cache.GetSize(), 512u);
  for (int i = 0; i < 5000; ++i) {
    cache.Put("one", SessionHandle(SSL_SESSION_new()));
  }
  EXPECT_LE(cache.GetSize(), 512u);
  cache.Clear();
  EXPECT_EQ(cache.GetSize(), 0u);
  for (int i = 0; i < 5000; ++i) {
    cache.Put("one", SessionHandle(SSL_SESSION_new()));
  }
  EXPECT_LE(cache.GetSize(), 64u);
}

} // namespace
} // namespace Tarvel::Ssl
