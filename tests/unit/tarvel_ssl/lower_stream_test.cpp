// SPDX-License-Identifier: Apache-2.0
// TLS over streams that throw, or on which writing fails.

#include "support/process_resources.h"
#include "system/io_engine.h"
#include "unit/tarvel_ssl/tls_client.h"

#include <tarvel/core/exception.h>

#include <boost/asio/post.hpp>
#include <gtest/gtest.h>

#include <openssl/ssl.h>

#include <atomic>
#include <functional>
#include <future>
#include <mutex>
#include <new>
#include <stdexcept>
#include <string>
#include <utility>

namespace Tarvel::Ssl {
namespace {

using Testing::Completion;
using Testing::CreateTrustingContext;
using Testing::PATIENCE;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsSettings;

/// A stream over TCP. After `Break` its writes fail, as they do when the server has reset the connection. Reads then
/// wait until a write has failed, so that a test knows which of the two ends first.
class BrokenWriter final : public System::Stream {
public:
  explicit BrokenWriter(const Ref<System::Stream> &inner) : m_inner(inner) {}

  void Break() { m_isBroken = true; }

  /// Whether a write is under way that began before `Break`.
  bool IsWriting() const { return m_writes != 0; }

  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override {
    const std::function<void()> read = [inner = m_inner, buffer, length, handler = std::move(handler)] {
      inner->AsyncReadSome(buffer, length, handler);
    };
    {
      const std::lock_guard<std::mutex> lock(m_mutex);
      if (m_isBroken && !m_hasFailed) {
        m_waitingRead = read;
        return;
      }
    }
    read();
  }
  void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) override {
    if (!m_isBroken) {
      ++m_writes;
      m_inner->AsyncWrite(bytes, length,
                          [self = Ref<BrokenWriter>(this), handler = std::move(handler)](std::size_t count,
                                                                                         const Exception *exception) {
                            handler(count, exception); // starts the next write, if there is one
                            --self->m_writes;
                          });
      return;
    }
    boost::asio::post(System::GetIoContext(), [self = Ref<BrokenWriter>(this), handler = std::move(handler)] {
      const System::NetworkException failure("Broken pipe");
      handler(0, &failure);
      self->StartWaitingRead();
    });
  }
  void Close() noexcept override { m_inner->Close(); }

private:
  void StartWaitingRead() {
    std::function<void()> read;
    {
      const std::lock_guard<std::mutex> lock(m_mutex);
      m_hasFailed = true;
      read.swap(m_waitingRead);
    }
    if (read) {
      read();
    }
  }

  const Ref<System::Stream> m_inner;
  std::atomic<bool> m_isBroken{false};
  std::atomic<int> m_writes{0};
  std::mutex m_mutex;                  // guards all that follows
  bool m_hasFailed = false;            // whether the handler of a failed write has been called
  std::function<void()> m_waitingRead; // empty for none
};

/// A TLS connection on which all writes fail, from before the handshake or only after it. Reads still succeed.
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
    // The client's part of the handshake ends before its last message is written, for which the server waits.
    EXPECT_TRUE(Testing::DrainIoThreads());
    EXPECT_TRUE(Testing::Eventually([&lower] { return !lower->IsWriting(); }));
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

/// A host's own stream. Each start of a read or a write throws what the test chooses.
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

} // namespace
} // namespace Tarvel::Ssl
