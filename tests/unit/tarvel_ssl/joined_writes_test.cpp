// SPDX-License-Identifier: Apache-2.0
// When the last message of a handshake is sent.

#include "support/completion.h"
#include "support/rendezvous.h"
#include "unit/tarvel_ssl/tls_client.h"

#include <gtest/gtest.h>

#include <openssl/ssl.h>

#include <atomic>
#include <string>
#include <utility>

namespace Tarvel::Ssl {
namespace {

using Testing::Completion;
using Testing::CreateTrustingContext;
using Testing::EventCount;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsSettings;

/// A stream over TCP that counts the writes.
class CountingStream final : public System::Stream {
public:
  explicit CountingStream(const Ref<System::Stream> &inner) : m_inner(inner) {}

  int GetWrites() const { return m_writes; }

  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override {
    m_inner->AsyncReadSome(buffer, length, std::move(handler));
  }
  void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) override {
    ++m_writes;
    m_inner->AsyncWrite(bytes, length, std::move(handler));
  }
  void Close() noexcept override { m_inner->Close(); }

private:
  const Ref<System::Stream> m_inner;
  std::atomic<int> m_writes{0};
};

TlsSettings Tls13() {
  TlsSettings settings;
  settings.minimumVersion = TLS1_3_VERSION;
  return settings;
}

Ref<CountingStream> Connect(int port) {
  const auto socket = System::CreateTcpClientSocket();
  Completion connected;
  socket->AsyncConnect("127.0.0.1", port, connected.ForEnd());
  EXPECT_EQ(connected.GetMessage(), "");
  return MakeRef<CountingStream>(socket);
}

TEST(LastMessageOfAHandshake, IsSentTogetherWithWhatTheHandlerWrites) {
  EventCount received;
  const ScriptedServer server(
      [&received](ServerConnection &connection) {
        if (connection.Handshake() && connection.ReadExactly(5) == "hello") {
          received.Add();
        }
        connection.WaitForInterrupt();
      },
      Tls13());
  const Ref<CountingStream> lower = Connect(server.GetPort());
  const Ref<SSLContext> context = CreateTrustingContext();
  const Ref<SSLStream> stream = context->CreateStream(lower, "localhost");
  Completion written;
  stream->AsyncHandshake("localhost", "", [&](const Exception *failure) {
    EXPECT_FALSE(failure);
    stream->AsyncWrite("hello", 5, written.ForTransfer());
  });
  EXPECT_EQ(written.GetMessage(), "");
  EXPECT_TRUE(received.WaitFor(1));
  EXPECT_EQ(lower->GetWrites(), 2) << "the first message of the handshake, and the last one with the bytes";
}

TEST(LastMessageOfAHandshake, IsSentEvenIfNothingIsWritten) {
  EventCount finished;
  const ScriptedServer server(
      [&finished](ServerConnection &connection) {
        if (connection.Handshake()) {
          finished.Add();
        }
        connection.WaitForInterrupt();
      },
      Tls13());
  const Ref<CountingStream> lower = Connect(server.GetPort());
  const Ref<SSLContext> context = CreateTrustingContext();
  const Ref<SSLStream> stream = context->CreateStream(lower, "localhost");
  Completion handshake;
  stream->AsyncHandshake("localhost", "", handshake.ForEnd());
  EXPECT_EQ(handshake.GetMessage(), "");
  EXPECT_TRUE(finished.WaitFor(1));
}

} // namespace
} // namespace Tarvel::Ssl
