// SPDX-License-Identifier: Apache-2.0

#include "unit/tarvel_ssl/tls_client.h"

#include "support/process_resources.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <openssl/err.h>
#include <openssl/ssl.h>

#include <atomic>
#include <future>
#include <string>
#include <vector>

namespace Tarvel::Ssl {
namespace {

using Testing::Completion;
using Testing::CreateTrustingContext;
using Testing::PATIENCE;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsClient;
using Testing::TlsSettings;

void Echo(ServerConnection &connection) {
  if (!connection.Handshake()) {
    return;
  }
  for (std::string some = connection.ReadSome(); !some.empty(); some = connection.ReadSome()) {
    connection.Write(some);
  }
}

TEST(SSLStream, ExchangesBytesOverEachAllowedVersion) {
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    TlsSettings settings;
    settings.minimumVersion = settings.maximumVersion = version;
    ScriptedServer server(Echo, settings);
    TlsClient client(CreateTrustingContext(), server.GetPort());
    ASSERT_EQ(client.Handshake(), "") << version;
    EXPECT_EQ(client.Write("hello"), "");
    EXPECT_EQ(client.Read(), "hello");
    EXPECT_FALSE(client.GetStream()->WasResumed());
  }
}

TEST(SSLStream, IsSecureButTheTcpConnectionBelowIsNot) {
  const Ref<System::Stream> socket = System::CreateTcpClientSocket();
  EXPECT_FALSE(socket->IsSecure());
  const Ref<System::Stream> stream = CreateTrustingContext()->CreateStream(socket, "localhost");
  EXPECT_TRUE(stream->IsSecure());
}

TEST(SSLStream, SendsTheServerNameButNoAddress) {
  std::promise<std::string> names[2];
  int next = 0;
  ScriptedServer server(
      [&](ServerConnection &connection) {
        connection.Handshake();
        names[next++].set_value(connection.GetServerName());
      },
      TlsSettings());
  TlsClient byName(CreateTrustingContext(), server.GetPort());
  EXPECT_EQ(byName.Handshake("LocalHost."), "");
  EXPECT_EQ(names[0].get_future().get(), "localhost");
  TlsClient byAddress(CreateTrustingContext(), server.GetPort());
  EXPECT_EQ(byAddress.Handshake("127.0.0.1"), "");
  EXPECT_EQ(names[1].get_future().get(), "");
}

TEST(SSLStream, ChecksAddressesAgainstTheCertificate) {
  ScriptedServer server(Echo, TlsSettings());
  for (const char *host : {"127.0.0.1", "::1", "[::1]", "::1%lo"}) {
    TlsClient client(CreateTrustingContext(), server.GetPort());
    EXPECT_EQ(client.Handshake(host), "") << host;
  }
  TlsClient client(CreateTrustingContext(), server.GetPort());
  EXPECT_EQ(client.Handshake("127.0.0.2"),
            "The TLS handshake with 127.0.0.2 failed: the server's certificate was not accepted: IP address mismatch "
            "(certificate \"CN=localhost\")");
}

TEST(SSLStream, MovesLargeMessagesBothWays) {
  ScriptedServer server(
      [](ServerConnection &connection) {
        connection.Handshake();
        connection.Write(connection.ReadExactly(4u << 20));
      },
      TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  std::string message(4u << 20, '\0');
  for (std::size_t i = 0; i < message.size(); ++i) {
    message[i] = static_cast<char>(i * 31 + i / 4096);
  }
  EXPECT_EQ(client.Write(message), "");
  std::string answer;
  while (answer.size() < message.size()) {
    const std::string some = client.Read();
    ASSERT_FALSE(client.HasFailed()) << some;
    answer += some;
  }
  EXPECT_TRUE(answer == message);
}

TEST(SSLStream, ReadsTheClosingNoticeAsTheOrderlyEnd) {
  ScriptedServer server(
      [](ServerConnection &connection) {
        connection.Handshake();
        connection.Write("bye");
      },
      TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  EXPECT_EQ(client.Read(), "bye");
  EXPECT_EQ(client.Read(), "");
  EXPECT_FALSE(client.HasFailed());
  EXPECT_EQ(client.Read(), "");
  EXPECT_FALSE(client.HasFailed());
}

TEST(SSLStream, ReportsAnEndWithoutClosingNoticeAsAFailure) {
  ScriptedServer server(
      [](ServerConnection &connection) {
        connection.Handshake();
        connection.Write("half");
        connection.CloseWithoutNotice();
      },
      TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  EXPECT_EQ(client.Read(), "half");
  const std::string failure =
      "The TLS connection to localhost broke: the server ended the connection without TLS's closing notice";
  EXPECT_EQ(client.Read(), failure);
  EXPECT_TRUE(client.HasFailed());
  EXPECT_EQ(client.Read(), failure);
  EXPECT_EQ(client.Write("x"), failure);
}

TEST(SSLStream, SendsTheClosingNoticeWhenItIsClosed) {
  std::promise<bool> noticed;
  ScriptedServer server(
      [&](ServerConnection &connection) {
        connection.Handshake();
        connection.Write("x");
        EXPECT_EQ(connection.ReadExactly(1), "y");
        connection.ReadSome();
        noticed.set_value(connection.ReceivedClosingNotice());
      },
      TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  EXPECT_EQ(client.Read(), "x");    // unread bytes would make the kernel send a reset
  EXPECT_EQ(client.Write("y"), ""); // a write that has not ended would prevent the notice
  client.GetStream()->Close();
  EXPECT_TRUE(noticed.get_future().get());
}

TEST(SSLStream, ReportsAResetBeforeTheHandshake) {
  std::promise<void> connected; // an earlier reset would make the connect fail
  ScriptedServer server(
      [future = connected.get_future().share()](ServerConnection &connection) {
        future.wait_for(PATIENCE);
        connection.Reset();
      },
      TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  connected.set_value();
  // The kernel reports a reset only once: if the write gets it, the concurrent read sees an orderly end.
  const std::string message = client.Handshake();
  EXPECT_EQ(message.rfind("The TLS handshake with localhost failed: ", 0), 0u) << message;
  EXPECT_TRUE(client.FailedInHandshake());
}

TEST(SSLStream, ReportsAResetWithinTheHandshake) {
  ScriptedServer server(
      [](ServerConnection &connection) {
        connection.ReadRawSome();
        connection.WriteRaw(std::string("\x16\x03\x03\x00\x7A\x02\x00", 7)); // the beginning of a server's hello
        connection.Reset();
      },
      TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  EXPECT_EQ(client.Handshake(), "The TLS handshake with localhost failed: The connection to 127.0.0.1:" +
                                    std::to_string(server.GetPort()) + " broke: Connection reset by peer");
}

TEST(SSLStream, ReportsAnEndWithinTheHandshake) {
  ScriptedServer server([](ServerConnection &connection) { connection.ReadRawSome(); }, TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  EXPECT_EQ(client.Handshake(),
            "The TLS handshake with localhost failed: the server ended the connection without TLS's "
            "closing notice");
}

TEST(SSLStream, ReportsAnOrderlyEndWithinTheHandshake) {
  ScriptedServer server([](ServerConnection &connection) {
    connection.ReadRawSome();
    connection.WriteRaw(std::string("\x15\x03\x03\x00\x02\x01\x00", 7)); // TLS's closing notice
    connection.Stall();
  });
  TlsClient client(CreateTrustingContext(), server.GetPort());
  EXPECT_EQ(client.Handshake(), "The TLS handshake with localhost failed: the server ended the connection");
}

TEST(SSLStream, ReportsAServerThatDoesNotSpeakTls) {
  ScriptedServer server([](ServerConnection &connection) {
    connection.ReadRawSome();
    connection.WriteRaw("HTTP/1.1 400 Bad Request\r\n\r\n");
    connection.Stall();
  });
  TlsClient client(CreateTrustingContext(), server.GetPort());
  EXPECT_EQ(client.Handshake(),
            "The TLS handshake with localhost failed: error:0A00010B:SSL routines::wrong version number");
}

TEST(SSLStream, RefusesAServerThatOffersOnlyOldTls) {
  TlsSettings settings;
  settings.minimumVersion = TLS1_VERSION;
  settings.maximumVersion = TLS1_1_VERSION;
  settings.allowsWeakness = true;
  ScriptedServer server(Echo, settings);
  TlsClient client(CreateTrustingContext(), server.GetPort());
  const std::string message = client.Handshake();
  EXPECT_EQ(message.rfind("The TLS handshake with localhost failed: error:", 0), 0u) << message;
  EXPECT_NE(message.find("alert protocol version"), std::string::npos) << message;
}

TEST(SSLStream, ReportsACorruptRecordAsAFailure) {
  ScriptedServer server(
      [](ServerConnection &connection) {
        connection.Handshake();
        connection.WriteRaw(std::string("\x17\x03\x03\x00\x20", 5) + std::string(32, 'x'));
        connection.Stall();
      },
      TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  const std::string message = client.Read();
  EXPECT_EQ(message.rfind("The TLS connection to localhost broke: error:", 0), 0u) << message;
}

TEST(SSLStream, EndsAStalledHandshakeWhenItIsClosed) {
  ScriptedServer server([](ServerConnection &connection) { connection.Stall(); }, TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  Completion handshake;
  client.GetStream()->AsyncHandshake("localhost", "", handshake.ForEnd());
  ASSERT_TRUE(Testing::DrainIoThreads());
  EXPECT_EQ(handshake.GetCalls(), 0);
  client.GetStream()->Close();
  EXPECT_EQ(handshake.GetMessage(), "The TLS handshake with localhost failed: closed by this side");
  ASSERT_TRUE(Testing::DrainIoThreads());
  EXPECT_EQ(handshake.GetCalls(), 1);
}

TEST(SSLStream, EndsPendingReadsAndWritesOnceWhenItIsClosed) {
  ScriptedServer server(
      [](ServerConnection &connection) {
        connection.Handshake();
        connection.WaitForInterrupt();
      },
      TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  char buffer[16];
  const std::string message(64u << 20, 'x');
  Completion read;
  Completion written;
  client.GetStream()->AsyncReadSome(buffer, sizeof buffer, read.ForTransfer());
  client.GetStream()->AsyncWrite(message.data(), message.size(), written.ForTransfer());
  ASSERT_TRUE(Testing::DrainIoThreads());
  EXPECT_EQ(read.GetCalls() + written.GetCalls(), 0);
  client.GetStream()->Close();
  EXPECT_EQ(read.GetMessage(), "The TLS connection to localhost broke: closed by this side");
  EXPECT_EQ(written.GetMessage(), "The TLS connection to localhost broke: closed by this side");
  ASSERT_TRUE(Testing::DrainIoThreads());
  EXPECT_EQ(read.GetCalls(), 1);
  EXPECT_EQ(written.GetCalls(), 1);
}

TEST(SSLStream, LeaksNoDescriptorAndNoThread) {
  ScriptedServer server([](ServerConnection &connection) { connection.Stall(); }, TlsSettings());
  const Ref<SSLContext> context = CreateTrustingContext();
  const auto attempt = [&](int i) {
    TlsClient client(context, server.GetPort());
    Completion handshake;
    client.GetStream()->AsyncHandshake("localhost", i % 2 == 0 ? "bad" : "", handshake.ForEnd());
    if (i % 2 != 0) {
      client.GetStream()->Close();
    }
    EXPECT_NE(handshake.GetMessage(), "");
  };
  attempt(0);
  const auto settled = [&](std::size_t limit) {
    return Testing::Eventually([limit] { return Testing::CountDescriptors() <= limit; });
  };
  ASSERT_TRUE(Testing::DrainIoThreads());
  ASSERT_TRUE(Testing::Eventually([&] { return server.GetOpenCount() == 0; }));
  const std::size_t before = Testing::CountDescriptors();
  const std::size_t threads = Testing::CountThreads();
  for (int i = 0; i < 40; ++i) {
    attempt(i);
  }
  EXPECT_TRUE(settled(before));
  EXPECT_TRUE(Testing::Eventually([threads] { return Testing::CountThreads() <= threads; }));
}

TEST(SSLStream, RefusesReadsAndWritesBeforeTheHandshake) {
  ScriptedServer server(Echo, TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  EXPECT_EQ(client.Read(), "The TLS handshake has not been started");
  EXPECT_EQ(client.Write("x"), "The TLS handshake has not been started");
  EXPECT_EQ(client.Handshake(), "");
  EXPECT_EQ(client.Handshake(), "The TLS handshake was started before");
  EXPECT_EQ(client.Write("x"), "");
  EXPECT_EQ(client.Read(), "x");
}

TEST(SSLStream, RefusesASecondReadAtTheSameTime) {
  ScriptedServer server(
      [](ServerConnection &connection) {
        connection.Handshake();
        connection.WaitForInterrupt();
      },
      TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  char buffer[2];
  Completion first;
  Completion second;
  client.GetStream()->AsyncReadSome(buffer, 1, first.ForTransfer());
  client.GetStream()->AsyncReadSome(buffer + 1, 1, second.ForTransfer());
  EXPECT_TRUE(second.FailedWith<InvalidStateException>());
  EXPECT_EQ(first.GetCalls(), 0);
  client.GetStream()->Close();
  EXPECT_TRUE(first.FailedWith<SSLException>());
}

TEST(SSLStream, NeitherReadsNorChangesTheHostsErrorQueue) {
  ScriptedServer server(Echo, TlsSettings());
  ERR_clear_error();
  ERR_put_error(ERR_LIB_USER, 0, 77, "host.cpp", 1);
  const unsigned long left = ERR_peek_error();
  {
    TlsClient client(CreateTrustingContext(), server.GetPort());
    EXPECT_EQ(client.Handshake(), "");
    EXPECT_EQ(client.Write("hello"), "");
    EXPECT_EQ(client.Read(), "hello");
    client.GetStream()->Close();
    TlsClient refused(CreateTrustingContext(), server.GetPort());
    EXPECT_NE(refused.Handshake("other.example"), "");
  }
  EXPECT_EQ(ERR_get_error(), left);
  EXPECT_EQ(ERR_get_error(), 0u);
}

TEST(SSLStream, ServesManyConnectionsAtOnce) {
  ScriptedServer server(Echo, TlsSettings());
  const Ref<SSLContext> context = CreateTrustingContext();
  std::vector<std::thread> threads;
  std::atomic<int> right{0};
  for (int t = 0; t < 8; ++t) {
    threads.emplace_back([&] {
      for (int i = 0; i < 10; ++i) {
        TlsClient client(context, server.GetPort());
        right += client.Handshake().empty() && client.Write("hello").empty() && client.Read() == "hello";
        client.GetStream()->Close();
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(right, 80);
}

} // namespace
} // namespace Tarvel::Ssl
