// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/stream.h>

#include "support/completion.h"
#include "support/process_resources.h"
#include "support/recorded_log.h"
#include "support/scripted_server.h"
#include "system/name_lookup.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <fcntl.h>
#include <future>
#include <netinet/in.h>
#include <string>
#include <sys/socket.h>
#include <thread>
#include <unistd.h>
#include <vector>

namespace Tarvel::System {
namespace {

using Testing::Completion;
using Testing::Eventually;
using Testing::FullPort;
using Testing::PATIENCE;
using Testing::ScriptedServer;
using Testing::ServerConnection;

std::string Connect(const Ref<TcpClientSocket> &socket, const std::string &host, int port) {
  Completion connected;
  socket->AsyncConnect(host, port, connected.ForEnd());
  return connected.GetMessage();
}

std::string Connect(const std::string &host, int port) {
  return Connect(CreateTcpClientSocket(), host, port);
}

std::string Read(const Ref<TcpClientSocket> &socket, std::size_t length = 100) {
  std::string bytes(length, '\0');
  Completion read;
  socket->AsyncReadSome(bytes.data(), bytes.size(), read.ForTransfer());
  if (const std::string failure = read.GetMessage(); !failure.empty()) {
    return failure;
  }
  bytes.resize(read.GetCount());
  return bytes;
}

void Echo(ServerConnection &connection) {
  for (std::string some = connection.ReadSome(); !some.empty(); some = connection.ReadSome()) {
    connection.Write(some);
  }
}

TEST(TcpClientSocket, ConnectsToNamesAndAddresses) {
  ScriptedServer server(Echo);
  for (const char *host : {"127.0.0.1", "localhost"}) {
    EXPECT_EQ(Connect(host, server.GetPort()), "") << host;
  }
}

TEST(TcpClientSocket, ConnectsToIPv6WithAndWithoutBracketsAndWithScope) {
  ScriptedServer server(Echo, std::nullopt, true);
  for (const char *host : {"::1", "[::1]", "0:0:0:0:0:0:0:1", "::1%lo", "[::1%lo]"}) {
    EXPECT_EQ(Connect(host, server.GetPort()), "") << host;
  }
}

TEST(TcpClientSocket, ExchangesBytes) {
  ScriptedServer server(Echo);
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  ASSERT_EQ(Connect(socket, "127.0.0.1", server.GetPort()), "");
  Completion written;
  socket->AsyncWrite("hello", 5, written.ForTransfer());
  EXPECT_EQ(written.GetMessage(), "");
  EXPECT_EQ(written.GetCount(), 5u);
  EXPECT_EQ(Read(socket), "hello");
}

TEST(TcpClientSocket, WritesAllOfALargeMessage) {
  constexpr std::size_t LENGTH = 16u << 20;
  std::promise<std::string> received;
  ScriptedServer server([&](ServerConnection &connection) { received.set_value(connection.ReadExactly(LENGTH)); });
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  ASSERT_EQ(Connect(socket, "127.0.0.1", server.GetPort()), "");
  std::string message(LENGTH, 'x');
  for (std::size_t i = 0; i < LENGTH; i += 997) {
    message[i] = static_cast<char>('a' + i % 26);
  }
  Completion written;
  socket->AsyncWrite(message.data(), message.size(), written.ForTransfer());
  EXPECT_EQ(written.GetMessage(), "");
  EXPECT_EQ(written.GetCount(), LENGTH);
  EXPECT_TRUE(received.get_future().get() == message);
}

TEST(TcpClientSocket, ReadsThePeersOrderlyEndAsZeroBytes) {
  ScriptedServer server([](ServerConnection &connection) { connection.Write("bye"); });
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  ASSERT_EQ(Connect(socket, "127.0.0.1", server.GetPort()), "");
  EXPECT_EQ(Read(socket), "bye");
  EXPECT_EQ(Read(socket), "");
  EXPECT_EQ(Read(socket), "");
}

TEST(TcpClientSocket, ReportsAResetWithEndpointAndReason) {
  std::promise<void> connected; // an early reset would make the connect fail
  ScriptedServer server([future = connected.get_future().share()](ServerConnection &connection) {
    future.wait_for(PATIENCE);
    connection.Reset();
  });
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  ASSERT_EQ(Connect(socket, "127.0.0.1", server.GetPort()), "");
  connected.set_value();
  const std::string failure =
      "The connection to 127.0.0.1:" + std::to_string(server.GetPort()) + " broke: Connection reset by peer";
  EXPECT_EQ(Read(socket), failure);
  EXPECT_EQ(Read(socket), failure);
}

TEST(TcpClientSocket, ReportsARefusedConnection) {
  const Testing::UnusedPort unused;
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  Completion connected;
  socket->AsyncConnect("127.0.0.1", unused.GetPort(), connected.ForEnd());
  EXPECT_EQ(connected.GetMessage(),
            "Cannot connect to 127.0.0.1:" + std::to_string(unused.GetPort()) + ": Connection refused");
  EXPECT_TRUE(connected.FailedWith<NetworkException>());
}

TEST(TcpClientSocket, ReportsAnIPv6AddressInBrackets) {
  const Testing::UnusedPort unused;
  const std::string port = std::to_string(unused.GetPort());
  EXPECT_EQ(Connect("::1", unused.GetPort()), "Cannot connect to [::1]:" + port + ": Connection refused");
  EXPECT_EQ(Connect("[::1]", unused.GetPort()), "Cannot connect to [::1]:" + port + ": Connection refused");
  EXPECT_EQ(Connect("::1%lo", unused.GetPort()), "Cannot connect to [::1%lo]:" + port + ": Connection refused");
  EXPECT_EQ(Connect("::1", 0), "Cannot connect to [::1]:0: the port is not between 1 and 65535");
}

TEST(TcpClientSocket, ReportsAnUnknownHost) {
  // RFC 1035, section 2.3.4: a label has at most 63 octets, so no name server is asked. The reason is the resolver's
  // text.
  const std::string host = std::string(64, 'x') + ".invalid";
  const std::string message = Connect(host, 443);
  EXPECT_EQ(message.rfind("Cannot connect to " + host + ":443: ", 0), 0u) << message;
}

TEST(TcpClientSocket, ReportsTheResolversReason) {
  const ScopedNameLookup lookup(
      [](const std::string &) -> AddressList { throw NetworkException("Name or service not known"); });
  EXPECT_EQ(Connect("sts.example", 443), "Cannot connect to sts.example:443: Name or service not known");
}

TEST(TcpClientSocket, ReportsANameWithoutAddress) {
  const ScopedNameLookup lookup([](const std::string &) { return AddressList(); });
  EXPECT_EQ(Connect("sts.example", 443), "Cannot connect to sts.example:443: The name has no address");
}

TEST(TcpClientSocket, RefusesInvalidHostsAndPorts) {
  struct Case {
    std::string host;
    int port;
    std::string reason;
  };
  const std::string notAscii = "the host name is not ASCII (an internationalised name must be in its \"xn--\" form)";
  const std::string control = "the host name contains a blank or a control character";
  const std::string port = "the port is not between 1 and 65535";
  for (const Case &bad : std::vector<Case>{{"", 1, "the host name is empty"},
                                           {"b\xC3\xBC"
                                            "cher.example",
                                            1, notAscii},
                                           {"a b", 1, control},
                                           {"a\r\n", 1, control},
                                           {"a", 0, port},
                                           {"a", -1, port},
                                           {"a", 65536, port},
                                           {"[a.example]", 1, "only an IPv6 address may be in brackets"}}) {
    EXPECT_EQ(Connect(bad.host, bad.port),
              "Cannot connect to " + bad.host + ":" + std::to_string(bad.port) + ": " + bad.reason);
  }
}

TEST(TcpClientSocket, RefusesAHostWithAZeroByte) {
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  Completion connected;
  socket->AsyncConnect(std::string("localhost\0.example", 18), 1, connected.ForEnd());
  EXPECT_TRUE(connected.FailedWith<NetworkException>());
}

TEST(TcpClientSocket, TriesTheNextAddressOfTheName) {
  ScriptedServer server(Echo);
  const ScopedNameLookup lookup([](const std::string &) {
    return AddressList{boost::asio::ip::make_address("::1"), boost::asio::ip::make_address("127.0.0.1")};
  });
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  EXPECT_EQ(Connect(socket, "two.example", server.GetPort()), "");
  Completion written;
  socket->AsyncWrite("x", 1, written.ForTransfer());
  EXPECT_EQ(Read(socket), "x");
}

TEST(TcpClientSocket, ReportsEachAddressThatFailed) {
  const Testing::UnusedPort unused;
  const ScopedNameLookup lookup([](const std::string &) {
    return AddressList{boost::asio::ip::make_address("::1"), boost::asio::ip::make_address("127.0.0.1")};
  });
  EXPECT_EQ(Connect("two.example", unused.GetPort()),
            "Cannot connect to two.example:" + std::to_string(unused.GetPort()) +
                ": ::1: Connection refused; 127.0.0.1: Connection refused");
}

TEST(TcpClientSocket, TriesTheNextAddressWhenOneNeverAnswers) {
  const FullPort full;
  const ScopedNameLookup lookup([](const std::string &) {
    return AddressList{boost::asio::ip::make_address("127.0.0.1"), boost::asio::ip::make_address("127.0.0.2")};
  });
  EXPECT_EQ(Connect("two.example", full.GetPort()),
            "Cannot connect to two.example:" + std::to_string(full.GetPort()) +
                ": 127.0.0.1: Connection timed out; 127.0.0.2: Connection refused");
}

TEST(TcpClientSocket, ClosingEndsAConnectWithoutAnswer) {
  const FullPort full;
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  ASSERT_TRUE(Testing::DrainIoThreads());
  const std::size_t descriptors = Testing::CountDescriptors();
  Completion connected;
  socket->AsyncConnect("127.0.0.1", full.GetPort(), connected.ForEnd());
  const Ref<ScheduledItem> canceller = CreateStreamCanceller(socket);
  ASSERT_TRUE(Testing::DrainIoThreads());
  ASSERT_EQ(connected.GetCalls(), 0);
  EXPECT_FALSE(canceller->IsDone());
  canceller->Cancel();
  canceller->Cancel();
  EXPECT_EQ(connected.GetMessage(), "Cannot connect to 127.0.0.1:" + std::to_string(full.GetPort()) + ": cancelled");
  EXPECT_TRUE(canceller->IsDone());
  ASSERT_TRUE(Testing::DrainIoThreads());
  EXPECT_EQ(connected.GetCalls(), 1);
  EXPECT_EQ(Testing::CountDescriptors(), descriptors);
}

TEST(TcpClientSocket, ClosingDoesNotWaitForALookupThatHangs) {
  std::promise<void> promise;
  const std::shared_future<void> answer = promise.get_future().share();
  std::atomic<int> running{0};
  {
    const ScopedNameLookup lookup([&running, answer](const std::string &) -> AddressList {
      ++running;
      answer.wait_for(PATIENCE);
      --running;
      throw NetworkException("too late");
    });
    const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
    Completion connected;
    socket->AsyncConnect("hangs.example", 443, connected.ForEnd());
    ASSERT_TRUE(Eventually([&] { return running == 1; }));
    socket->Close();
    EXPECT_EQ(connected.GetMessage(), "Cannot connect to hangs.example:443: cancelled");
    EXPECT_EQ(running, 1);
    promise.set_value();
    ASSERT_TRUE(Eventually([&] { return running == 0; }));
    ASSERT_TRUE(Testing::DrainIoThreads());
    EXPECT_EQ(connected.GetCalls(), 1);
  }
}

TEST(TcpClientSocket, ClosingEndsAPendingRead) {
  ScriptedServer server([](ServerConnection &connection) { connection.Stall(); });
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  ASSERT_EQ(Connect(socket, "127.0.0.1", server.GetPort()), "");
  char buffer[16];
  Completion read;
  socket->AsyncReadSome(buffer, sizeof buffer, read.ForTransfer());
  socket->Close();
  EXPECT_EQ(read.GetMessage(),
            "The connection to 127.0.0.1:" + std::to_string(server.GetPort()) + " was closed by this side");
  EXPECT_TRUE(read.FailedWith<NetworkException>());
  ASSERT_TRUE(Testing::DrainIoThreads());
  EXPECT_EQ(read.GetCalls(), 1);
}

TEST(TcpClientSocket, ClosingEndsAWriteThatThePeerDoesNotRead) {
  std::promise<void> done;
  ScriptedServer server([future = done.get_future().share()](ServerConnection &) { future.wait_for(PATIENCE); });
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  ASSERT_EQ(Connect(socket, "127.0.0.1", server.GetPort()), "");
  const std::string message(64u << 20, 'x');
  Completion written;
  socket->AsyncWrite(message.data(), message.size(), written.ForTransfer());
  ASSERT_TRUE(Testing::DrainIoThreads());
  ASSERT_EQ(written.GetCalls(), 0);
  socket->Close();
  EXPECT_TRUE(written.FailedWith<NetworkException>());
  ASSERT_TRUE(Testing::DrainIoThreads());
  EXPECT_EQ(written.GetCalls(), 1);
  done.set_value();
}

TEST(TcpClientSocket, OperationsWithoutAConnectionFail) {
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  EXPECT_EQ(Read(socket), "There is no connection");
  Completion written;
  socket->AsyncWrite("x", 1, written.ForTransfer());
  EXPECT_EQ(written.GetMessage(), "There is no connection");
  socket->Close();
  EXPECT_EQ(Connect(socket, "127.0.0.1", 1), "The socket has been used or closed already");
}

TEST(TcpClientSocket, HandlersNeverRunInsideTheStartingCall) {
  ScriptedServer server(Echo);
  const std::thread::id self = std::this_thread::get_id();
  std::vector<std::promise<bool>> elsewhere(3);
  const auto note = [&](std::size_t i) { elsewhere[i].set_value(std::this_thread::get_id() != self); };
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  char buffer[1];
  socket->AsyncReadSome(buffer, 1, [&](std::size_t, const Exception *) { note(0); });
  socket->AsyncConnect("", 0, [&](const Exception *) { note(1); });
  const Ref<TcpClientSocket> other = CreateTcpClientSocket();
  other->AsyncConnect("127.0.0.1", server.GetPort(), [&](const Exception *) { note(2); });
  for (std::promise<bool> &promise : elsewhere) {
    EXPECT_TRUE(promise.get_future().get());
  }
}

TEST(TcpClientSocket, WorksAfterAHandlerHasThrown) {
  const Testing::RecordedLog log;
  ScriptedServer server(Echo);
  for (int i = 0; i < 10; ++i) {
    CreateTcpClientSocket()->AsyncConnect("127.0.0.1", server.GetPort(), [](const Exception *) { throw 1; });
  }
  ASSERT_TRUE(log.WaitForLines(10)); // one for each handler
  EXPECT_EQ(Connect("127.0.0.1", server.GetPort()), "");
}

TEST(TcpClientSocket, ClosesItsDescriptorOnExec) {
  ScriptedServer server([](ServerConnection &connection) { connection.Stall(); });
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  ASSERT_EQ(Connect(socket, "127.0.0.1", server.GetPort()), "");
  int sockets = 0;
  for (int descriptor = 3; descriptor < 256; ++descriptor) {
    sockaddr_in peer{};
    socklen_t length = sizeof peer;
    if (::getpeername(descriptor, reinterpret_cast<sockaddr *>(&peer), &length) == 0 &&
        ntohs(peer.sin_port) == server.GetPort()) {
      ++sockets;
      EXPECT_NE(::fcntl(descriptor, F_GETFD) & FD_CLOEXEC, 0);
    }
  }
  EXPECT_EQ(sockets, 1);
}

TEST(TcpClientSocket, LeaksNeitherDescriptorsNorThreads) {
  ScriptedServer server([](ServerConnection &connection) { connection.Stall(); });
  ASSERT_EQ(Connect("localhost", server.GetPort()), ""); // starts the I/O threads
  ASSERT_TRUE(Testing::DrainIoThreads());
  std::vector<Ref<TcpClientSocket>> sockets;
  const std::size_t threads = Testing::CountThreads();
  for (int round = 0; round < 2; ++round) {
    for (int i = 0; i < 50; ++i) {
      sockets.push_back(CreateTcpClientSocket());
      sockets.back()->AsyncConnect(i % 2 == 0 ? "localhost" : "127.0.0.1", server.GetPort(), [](const Exception *) {});
      if (i % 3 == 0) {
        sockets.back()->Close();
      }
    }
    sockets.clear();
  }
  ASSERT_EQ(Connect("localhost", server.GetPort()), "");
  const auto descriptorsLeft = [&] {
    int count = 0;
    for (int descriptor = 3; descriptor < 1024; ++descriptor) {
      sockaddr_in peer{};
      socklen_t length = sizeof peer;
      count += ::getpeername(descriptor, reinterpret_cast<sockaddr *>(&peer), &length) == 0 &&
               ntohs(peer.sin_port) == server.GetPort();
    }
    return count;
  };
  EXPECT_TRUE(Eventually([&] { return descriptorsLeft() == 0; }));
  EXPECT_TRUE(Eventually([&] { return Testing::CountThreads() <= threads; }));
}

TEST(StreamCanceller, IsDoneOnceTheConnectHasEnded) {
  ScriptedServer server(Echo);
  const Ref<TcpClientSocket> socket = CreateTcpClientSocket();
  const Ref<ScheduledItem> canceller = CreateStreamCanceller(socket);
  EXPECT_FALSE(canceller->IsDone());
  ASSERT_EQ(Connect(socket, "127.0.0.1", server.GetPort()), "");
  EXPECT_TRUE(canceller->IsDone());
}

} // namespace
} // namespace Tarvel::System
