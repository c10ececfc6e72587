// SPDX-License-Identifier: Apache-2.0
// Memory that runs out at each place in turn. A completion is still called once, unless the start has thrown.
#include "integration/scarce_resources/memory_shortage.h"
#include "support/completion.h"
#include "support/process_resources.h"
#include "support/scripted_server.h"
#include "system/name_lookup.h"

#include <ssoclient/connection_spec.h>
#include <tarvel/http/connection_spec.h>
#include <tarvel/system/stream.h>

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <cstdio>
#include <cstring>
#include <functional>
#include <new>
#include <set>
#include <string>
#include <sys/prctl.h>
#include <utility>
#include <vector>

namespace Testing {
namespace {

using Tarvel::Exception;
using Tarvel::Ref;
using Tarvel::System::CreateTcpClientSocket;
using Tarvel::System::TcpClientSocket;

constexpr int MAX_PIECES = 1000;

/// Records the one call of a completion, without allocating memory.
class Note {
public:
  auto ForEnd() {
    return [this](const Exception *failure) { Write(failure); };
  }
  auto ForTransfer() {
    return [this](std::size_t, const Exception *failure) { Write(failure); };
  }

  int CountCalls() const { return m_calls; }
  bool Wait() const {
    return Eventually([this] { return m_calls > 0; });
  }
  /// The message that the completion got; empty without a failure.
  std::string GetMessage() const { return m_message.data(); }

private:
  void Write(const Exception *failure) noexcept {
    if (failure) {
      std::snprintf(m_message.data(), m_message.size(), "%s", failure->what());
    }
    ++m_calls;
  }

  std::array<char, 256> m_message{};
  std::atomic<int> m_calls{0};
};

struct Attempt {
  std::function<void(TcpClientSocket &)> prepare; ///< called before the shortage
  std::function<void(TcpClientSocket &, Note &)> start;
  std::function<void(TcpClientSocket &)> end; ///< called during the shortage
};

/// Makes the attempt with each allocation refused in turn. Returns the messages of the failures; "" for a success.
std::set<std::string> FailAtEachPiece(Shortage shortage, const Attempt &attempt) {
  std::set<std::string> messages;
  EXPECT_TRUE(DrainIoThreads());
  for (int pieces = 0; pieces < MAX_PIECES; ++pieces) {
    const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
    attempt.prepare(*socket);
    Note note;
    const bool hasThrown = StartShortOfMemory(shortage, pieces, [&] { attempt.start(*socket, note); });
    attempt.end(*socket);
    EXPECT_TRUE(hasThrown || note.Wait()) << "piece " << pieces;
    const int refused = EndShortage();
    socket->Close();
    EXPECT_TRUE(DrainIoThreads());
    EXPECT_EQ(note.CountCalls(), hasThrown ? 0 : 1) << "piece " << pieces;
    messages.insert(hasThrown ? "(thrown)" : note.GetMessage());
    if (refused == 0) {
      return messages;
    }
  }
  ADD_FAILURE() << "the attempt makes ever more allocations";
  return messages;
}

void DoNothing(TcpClientSocket &) {}

std::string Target(const std::string &host, int port) {
  return "Cannot connect to " + host + ":" + std::to_string(port) + ": ";
}

class WithoutMemory : public testing::TestWithParam<Shortage> {
protected:
  void SetUp() override { CreateTcpClientSocket(); } // starts the I/O threads
};

TEST_P(WithoutMemory, CompletesAConnectToAnAddressOnce) {
  ScriptedServer server([](ServerConnection &peer) { peer.Stall(); });
  const int port = server.GetPort();
  const std::string host = "127.0.0.1";
  const std::set<std::string> messages = FailAtEachPiece(
      GetParam(),
      {DoNothing, [&](TcpClientSocket &socket, Note &note) { socket.AsyncConnect(host, port, note.ForEnd()); },
       DoNothing});
  for (const std::string &message : messages) {
    EXPECT_TRUE(message.empty() || message == "(thrown)" ||
                message == Target(host, port) + "there is not enough memory" || message == "There is not enough memory")
        << message;
  }
  EXPECT_EQ(messages.count(""), 1u);
  EXPECT_GE(messages.size(), 3u);
}

TEST_P(WithoutMemory, CompletesAConnectToANameOnce) {
  ScriptedServer server([](ServerConnection &peer) { peer.Stall(); });
  const int port = server.GetPort();
  const std::string host = "a-name-that-is-longer-than-a-short-text.example";
  const Tarvel::System::ScopedNameLookup lookup([](const std::string &) {
    return Tarvel::System::AddressList{boost::asio::ip::make_address("::1"),
                                       boost::asio::ip::make_address("127.0.0.1")};
  });
  const std::set<std::string> messages = FailAtEachPiece(
      GetParam(),
      {DoNothing, [&](TcpClientSocket &socket, Note &note) { socket.AsyncConnect(host, port, note.ForEnd()); },
       DoNothing});
  for (const std::string &message : messages) {
    EXPECT_TRUE(message.empty() || message == "(thrown)" ||
                message == Target(host, port) + "there is not enough memory" || message == "There is not enough memory")
        << message;
  }
  EXPECT_EQ(messages.count(""), 1u);
  EXPECT_GE(messages.size(), 3u);
}

TEST_P(WithoutMemory, CompletesAConnectOfAConnectionSpecOnce) {
  ScriptedServer server([](ServerConnection &peer) { peer.Stall(); });
  Ref<Tarvel::Http::ConnectionSpec> plain;
  Ref<Tarvel::Http::ConnectionSpec> withoutContext;
  SsoClient::CreateSsoConnectionSpec("127.0.0.1", server.GetPort(), false, plain);
  SsoClient::CreateSsoSSLConnectionSpec("127.0.0.1", server.GetPort(), nullptr, "", false, withoutContext);
  const std::string target = Target("127.0.0.1", server.GetPort());
  const std::string refusal = "Invalid argument : an SSL connection needs an SSLContext.";
  for (const auto &[spec, outcome] : {std::pair(plain, std::string()), std::pair(withoutContext, refusal)}) {
    const std::set<std::string> messages = FailAtEachPiece(
        GetParam(), {DoNothing,
                     [&spec = spec](TcpClientSocket &, Note &note) {
                       spec->AsyncConnect([&note](const Ref<Tarvel::System::Stream> &, const Exception *failure) {
                         note.ForEnd()(failure);
                       });
                     },
                     DoNothing});
    for (const std::string &message : messages) {
      EXPECT_TRUE(message == outcome || message == "(thrown)" || message == target + "there is not enough memory" ||
                  message == "There is not enough memory")
          << message;
    }
    EXPECT_EQ(messages.count(outcome), 1u);
    EXPECT_EQ(messages.count("(thrown)"), 1u);
  }
}

TEST_P(WithoutMemory, CompletesAClosedConnectOnce) {
  const FullPort full;
  const std::string host = "127.0.0.1";
  const std::set<std::string> messages =
      FailAtEachPiece(GetParam(), {DoNothing,
                                   [&](TcpClientSocket &socket, Note &note) {
                                     {
                                       const EnoughMemory whileConnecting;
                                       socket.AsyncConnect(host, full.GetPort(), note.ForEnd());
                                     }
                                     socket.Close();
                                   },
                                   DoNothing});
  EXPECT_EQ(messages,
            (std::set<std::string>{"There is not enough memory", Target(host, full.GetPort()) + "cancelled"}));
}

void Connect(TcpClientSocket &socket, int port) {
  Note connected;
  socket.AsyncConnect("127.0.0.1", port, connected.ForEnd());
  ASSERT_TRUE(connected.Wait());
  ASSERT_EQ(connected.GetMessage(), "");
}

TEST_P(WithoutMemory, CompletesAReadOnce) {
  ScriptedServer server([](ServerConnection &peer) { peer.Stall(); });
  char byte = 0;
  const std::set<std::string> messages = FailAtEachPiece(
      GetParam(), {[&](TcpClientSocket &socket) { Connect(socket, server.GetPort()); },
                   [&](TcpClientSocket &socket, Note &note) { socket.AsyncReadSome(&byte, 1, note.ForTransfer()); },
                   [](TcpClientSocket &socket) { socket.Close(); }});
  const std::string closed =
      "The connection to 127.0.0.1:" + std::to_string(server.GetPort()) + " was closed by this side";
  EXPECT_EQ(messages, (std::set<std::string>{"(thrown)", "There is not enough memory", closed}));
}

TEST_P(WithoutMemory, CompletesAWriteInSeveralPartsOnce) {
  constexpr std::size_t LENGTH = 8u << 20; // more than the system accepts at once
  ScriptedServer server([](ServerConnection &peer) { peer.ReadExactly(LENGTH); });
  const std::string message(LENGTH, 'x');
  const std::set<std::string> messages =
      FailAtEachPiece(GetParam(), {[&](TcpClientSocket &socket) { Connect(socket, server.GetPort()); },
                                   [&](TcpClientSocket &socket, Note &note) {
                                     socket.AsyncWrite(message.data(), message.size(), note.ForTransfer());
                                   },
                                   DoNothing});
  const std::string broken =
      "The connection to 127.0.0.1:" + std::to_string(server.GetPort()) + " broke: Cannot allocate memory";
  for (const std::string &one : messages) {
    EXPECT_TRUE(one.empty() || one == "(thrown)" || one == broken || one == "There is not enough memory") << one;
  }
  EXPECT_EQ(messages.count(""), 1u);
  EXPECT_EQ(messages.count("(thrown)"), 1u);
}

INSTANTIATE_TEST_SUITE_P(Shortages, WithoutMemory, testing::Values(Shortage::OF_ONE_PIECE, Shortage::FROM_ONE_PIECE_ON),
                         [](const testing::TestParamInfo<Shortage> &shortage) {
                           return shortage.param == Shortage::OF_ONE_PIECE ? "OfOnePiece" : "FromOnePieceOn";
                         });

} // namespace
} // namespace Testing
