// SPDX-License-Identifier: Apache-2.0

#include "unit/tarvel_ssl/tls_client.h"

#include "support/process_resources.h"
#include "system/io_engine.h"

#include <tarvel/core/exception.h>

#include <boost/asio/post.hpp>

#include <gtest/gtest.h>

#include <openssl/err.h>
#include <openssl/ssl.h>

#include <atomic>
#include <cstdlib>
#include <functional>
#include <future>
#include <new>
#include <stdexcept>
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
        connection.ReadSome();
        noticed.set_value(connection.ReceivedClosingNotice());
      },
      TlsSettings());
  TlsClient client(CreateTrustingContext(), server.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  EXPECT_EQ(client.Read(), "x"); // unread bytes would make the kernel send a reset
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

/// A stream over TCP. After `Break` its writes fail, as they do when the server has reset the connection.
class BrokenWriter final : public System::Stream {
public:
  explicit BrokenWriter(const Ref<System::Stream> &inner) : m_inner(inner) {}

  void Break() { m_isBroken = true; }

  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override {
    m_inner->AsyncReadSome(buffer, length, std::move(handler));
  }
  void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) override {
    if (!m_isBroken) {
      m_inner->AsyncWrite(bytes, length, std::move(handler));
      return;
    }
    boost::asio::post(System::GetIoContext(), [handler = std::move(handler)] {
      const System::NetworkException failure("Broken pipe");
      handler(0, &failure);
    });
  }
  void Close() noexcept override { m_inner->Close(); }

private:
  const Ref<System::Stream> m_inner;
  std::atomic<bool> m_isBroken{false};
};

/// A TLS connection on which writing breaks, before or after the handshake, and reading goes on.
class BrokenConnection {
public:
  BrokenConnection(int port, bool beforeTheHandshake) {
    const auto socket = System::CreateTcpClientSocket();
    Completion connected;
    socket->AsyncConnect("127.0.0.1", port, connected.ForEnd());
    EXPECT_EQ(connected.GetMessage(), "");
    const auto lower = MakeRef<BrokenWriter>(socket);
    m_context = CreateTrustingContext();
    stream = m_context->CreateStream(lower, "localhost");
    if (beforeTheHandshake) {
      lower->Break();
    }
    stream->AsyncHandshake("localhost", "", handshake.ForEnd());
    EXPECT_TRUE(handshake.Wait());
    lower->Break();
  }

  std::string Write(const std::string &bytes) const {
    Completion written;
    stream->AsyncWrite(bytes.data(), bytes.size(), written.ForTransfer());
    return written.GetMessage();
  }
  std::string Read() const {
    std::string bytes(100, '\0');
    Completion read;
    stream->AsyncReadSome(bytes.data(), bytes.size(), read.ForTransfer());
    const std::string failure = read.GetMessage();
    return failure.empty() ? bytes.substr(0, read.GetCount()) : failure;
  }

  Ref<SSLStream> stream;
  Completion handshake;

private:
  Ref<SSLContext> m_context;
};

/// A host's own stream. Each start throws what the test chooses.
class ThrowingStream final : public System::Stream {
public:
  explicit ThrowingStream(std::function<void()> start) : m_start(std::move(start)) {}

  void AsyncReadSome(char *, std::size_t, TransferHandler) override { m_start(); }
  void AsyncWrite(const char *, std::size_t, TransferHandler) override { m_start(); }
  void Close() noexcept override {}

private:
  const std::function<void()> m_start;
};

TEST(SSLStream, EndsTheHandshakeOnceWhenTheStreamBelowThrows) {
  const std::string failed = "The TLS handshake with localhost failed: ";
  struct Case {
    std::function<void()> start;
    std::string message;
  };
  for (const Case &thrown : {Case{[] { throw InvalidStateException("ours"); }, failed + "ours"},
                             Case{[] { throw std::runtime_error("foreign"); }, failed + "foreign"},
                             Case{[] { throw 1; }, failed + "an object that is not an exception was thrown"},
                             Case{[] { throw std::bad_alloc(); }, "There is not enough memory"}}) {
    const Ref<SSLStream> stream =
        CreateTrustingContext()->CreateStream(MakeRef<ThrowingStream>(thrown.start), "localhost");
    Completion handshake;
    stream->AsyncHandshake("localhost", "", handshake.ForEnd());
    EXPECT_EQ(handshake.GetMessage(), thrown.message);
    stream->Close();
    EXPECT_TRUE(Testing::DrainIoThreads());
    EXPECT_EQ(handshake.GetCalls(), 1);
  }
}

TEST(SSLStream, ReadsBytesThatTheServerSentAfterAFailedWrite) {
  std::promise<void> failed;
  ScriptedServer server(
      [future = failed.get_future().share()](ServerConnection &connection) {
        connection.Handshake();
        future.wait_for(PATIENCE);
        connection.Write("413");
      },
      TlsSettings());
  const BrokenConnection client(server.GetPort(), false);
  const std::string broken = "The TLS connection to localhost broke: Broken pipe";
  EXPECT_EQ(client.Write("request"), broken);
  EXPECT_EQ(client.Write("again"), broken);
  failed.set_value();
  EXPECT_EQ(client.Read(), "413");
  EXPECT_EQ(client.Read(), "");
}

TEST(SSLStream, ReportsTheFailedWriteWhenTheServerEndsWithoutNotice) {
  std::promise<void> failed;
  ScriptedServer server(
      [future = failed.get_future().share()](ServerConnection &connection) {
        connection.Handshake();
        future.wait_for(PATIENCE);
        connection.CloseWithoutNotice();
      },
      TlsSettings());
  const BrokenConnection client(server.GetPort(), false);
  const std::string broken = "The TLS connection to localhost broke: Broken pipe";
  EXPECT_EQ(client.Write("request"), broken);
  failed.set_value();
  EXPECT_EQ(client.Read(), broken);
}

TEST(SSLStream, ReportsTheAlertOfAHandshakeInWhichNothingCanBeWritten) {
  ScriptedServer server([](ServerConnection &connection) {
    connection.WriteRaw(std::string("\x15\x03\x03\x00\x02\x02\x28", 7)); // fatal, handshake failure
    connection.Stall();
  });
  const BrokenConnection client(server.GetPort(), true);
  EXPECT_EQ(client.handshake.GetMessage(), "The TLS handshake with localhost failed: error:0A000410:SSL routines::"
                                           "sslv3 alert handshake failure (SSL alert number 40)");
}

TEST(SSLStream, ReportsTheFailedWriteOfAHandshakeThatTheServerEnds) {
  ScriptedServer server([](ServerConnection &connection) { connection.CloseWithoutNotice(); });
  const BrokenConnection client(server.GetPort(), true);
  EXPECT_EQ(client.handshake.GetMessage(), "The TLS handshake with localhost failed: Broken pipe");
}

TEST(SSLStream, ReportsThatACertificateIsRequired) {
  TlsSettings settings;
  settings.demandsClient = true;
  settings.minimumVersion = TLS1_3_VERSION;
  ScriptedServer server([](ServerConnection &connection) { connection.Handshake(); }, settings);
  const BrokenConnection client(server.GetPort(), false);
  EXPECT_EQ(client.handshake.GetMessage(), "");
  EXPECT_EQ(client.Write("request"), "The TLS connection to localhost broke: Broken pipe");
  EXPECT_EQ(client.Read(), "The TLS connection to localhost broke: error:0A00045C:SSL routines::"
                           "tlsv13 alert certificate required (SSL alert number 116)");
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

/// Ends the process during handshakes. The server uses no OpenSSL, so that only the clients' use of it is tested.
void EndWhileBusy() {
  auto *const server = new ScriptedServer([](ServerConnection &connection) {
    connection.ReadRawSome();
    connection.Reset();
  });
  const Ref<SSLContext> context = CreateTrustingContext();
  static std::atomic<int> attempts{0};
  for (int t = 0; t < 4; ++t) {
    std::thread([context, port = server->GetPort()] {
      for (;; ++attempts) {
        try {
          TlsClient(context, port).Handshake();
        } catch (const std::exception &) {
          // The server resets connections at any time.
        }
      }
    }).detach();
  }
  Testing::Eventually([] { return attempts > 20; });
  std::exit(0);
}

TEST(SSLStreamDeathTest, LetsTheProcessEndDuringHandshakes) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  for (int i = 0; i < 20; ++i) {
    ASSERT_EXIT(EndWhileBusy(), testing::ExitedWithCode(0), "") << i;
  }
}

} // namespace
} // namespace Tarvel::Ssl
