// SPDX-License-Identifier: Apache-2.0
// Connections of a parent process, and what its child can do with its copies.

#include "integration/fork/server_process.h"
#include "ssl/ssl_context_impl.h"
#include "support/forked.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"
#include "system/name_lookup.h"
#include "unit/tarvel_ssl/tls_client.h"

#include <tarvel/system/stream.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <filesystem>
#include <fstream>
#include <linux/kcmp.h>
#include <memory>
#include <set>
#include <string>
#include <sys/syscall.h>
#include <system_error>
#include <thread>
#include <unistd.h>
#include <vector>

namespace Tarvel {
namespace {

using Testing::Completion;
using Testing::CreateTrustingContext;
using Testing::RunInChild;
using Testing::ServerConnection;
using Testing::ServerProcess;
using Testing::Shared;
using Testing::TlsClient;
using Testing::TlsSettings;

constexpr const char *OF_PARENT = "The connection belongs to the process that this one was forked from";

/// Sends back all bytes, until the client ends the connection.
void Echo(ServerConnection &connection) {
  connection.Handshake();
  for (std::string bytes = connection.ReadSome(); !bytes.empty(); bytes = connection.ReadSome()) {
    connection.Write(bytes);
  }
}

Ref<System::TcpClientSocket> Connect(int port) {
  Ref<System::TcpClientSocket> socket = System::CreateTcpClientSocket();
  Completion connected;
  socket->AsyncConnect("127.0.0.1", port, connected.ForEnd());
  EXPECT_EQ(connected.GetMessage(), "");
  return socket;
}

std::string Write(System::Stream &stream, const std::string &bytes) {
  Completion written;
  stream.AsyncWrite(bytes.data(), bytes.size(), written.ForTransfer());
  return written.GetMessage();
}

/// The bytes that were read, or the message of the failure.
std::string Read(System::Stream &stream) {
  std::string bytes(100, '\0');
  Completion read;
  stream.AsyncReadSome(bytes.data(), bytes.size(), read.ForTransfer());
  const std::string failure = read.GetMessage();
  return failure.empty() ? bytes.substr(0, read.GetCount()) : failure;
}

/// The descriptors of this process of one kind, such as "socket:", each as its number and its target, such as
/// "socket:[4711]".
std::set<std::string> DescriptorsOfKind(const std::string &kind) {
  std::set<std::string> found;
  for (const auto &entry : std::filesystem::directory_iterator("/proc/self/fd")) {
    std::error_code gone; // for the directory's own descriptor
    const std::string target = std::filesystem::read_symlink(entry.path(), gone).string();
    if (target.rfind(kind, 0) == 0) {
      found.insert(entry.path().filename().string() + " " + target);
    }
  }
  return found;
}

/// What each epoll set of this process watches, in the kernel's words.
std::string DescribeEpollSets() {
  std::string described;
  for (const std::string &entry : DescriptorsOfKind("anon_inode:[eventpoll]")) {
    std::ifstream info("/proc/self/fdinfo/" + entry.substr(0, entry.find(' ')));
    std::vector<std::string> watched;
    for (std::string line; std::getline(info, line);) {
      if (line.rfind("tfd:", 0) == 0) {
        watched.push_back(line.substr(0, line.find("pos:")));
      }
    }
    std::sort(watched.begin(), watched.end());
    for (const std::string &line : watched) {
      described += line + '\n';
    }
  }
  return described;
}

TEST(SocketAfterFork, IsClosedInTheChildAndWorksInTheParent) {
  const ServerProcess server(Echo);
  EXPECT_EQ(RunInChild([&] { // without threads that may still close sockets of earlier tests
              const std::set<std::string> before = DescriptorsOfKind("socket:");
              const Ref<System::TcpClientSocket> socket = Connect(server.GetPort());
              ASSERT_EQ(DescriptorsOfKind("socket:").size(), before.size() + 1);
              const std::string watched = DescribeEpollSets();
              ASSERT_NE(watched, "");
              EXPECT_EQ(RunInChild([&] {
                          EXPECT_EQ(DescriptorsOfKind("socket:"), before);
                          const std::string target = "127.0.0.1:" + std::to_string(server.GetPort());
                          EXPECT_EQ(Write(*socket, "child"), "There is no connection to " + target);
                          EXPECT_EQ(Read(*socket), "There is no connection to " + target);
                          socket->Close();
                          const Ref<System::TcpClientSocket> own = Connect(server.GetPort());
                          EXPECT_EQ(Write(*own, "mine"), "");
                          EXPECT_EQ(Read(*own), "mine");
                        }),
                        "");
              EXPECT_EQ(DescribeEpollSets(), watched) << "nothing was removed from the epoll set or added to it";
              EXPECT_EQ(Write(*socket, "parent"), "");
              EXPECT_EQ(Read(*socket), "parent") << "without a byte of the child's before it";
            }),
            "");
}

/// Whether two descriptors of two processes are copies of each other.
bool AreCopies(pid_t process, int descriptor, pid_t otherProcess, int otherDescriptor) {
  const long order = ::syscall(SYS_kcmp, process, otherProcess, KCMP_FILE, descriptor, otherDescriptor);
  EXPECT_GE(order, 0) << std::generic_category().message(errno);
  return order == 0;
}

TEST(SocketAfterFork, LeavesTheChildNoCopyOfTheIoThreadsDescriptors) {
  const ServerProcess server(Echo);
  const Ref<System::TcpClientSocket> socket = Connect(server.GetPort());
  const std::set<std::string> ofParent = DescriptorsOfKind("anon_inode:");
  ASSERT_FALSE(ofParent.empty());
  const int first = std::stoi(*ofParent.begin());
  if (::syscall(SYS_kcmp, ::getpid(), ::getpid(), KCMP_FILE, first, first) != 0) {
    GTEST_SKIP() << "the system does not let a process compare descriptors";
  }
  const pid_t parent = ::getpid();
  EXPECT_EQ(RunInChild([&] {
              const Ref<System::TcpClientSocket> own = Connect(server.GetPort());
              for (const std::string &mine : DescriptorsOfKind("anon_inode:")) {
                for (const std::string &theirs : ofParent) {
                  EXPECT_FALSE(AreCopies(::getpid(), std::stoi(mine), parent, std::stoi(theirs))) << mine;
                }
              }
            }),
            "");
}

TEST(SocketAfterFork, CallsNoCompletionOfTheParentInTheChild) {
  const ServerProcess silent([](ServerConnection &connection) { connection.Stall(); });
  const Shared<std::atomic<int>> calls;
  const auto count = [&calls](std::size_t, const Exception *) { ++*calls; };
  const Ref<System::TcpClientSocket> socket = Connect(silent.GetPort());
  char byte = 0;
  socket->AsyncReadSome(&byte, 1, count);
  EXPECT_EQ(RunInChild([&] {
              socket->Close();
              EXPECT_EQ(Read(*socket), "There is no connection to 127.0.0.1:" + std::to_string(silent.GetPort()));
              EXPECT_TRUE(Testing::DrainIoThreads());
            }),
            "");
  EXPECT_EQ(*calls, 0);
  socket->Close();
  EXPECT_TRUE(Testing::Eventually([&] { return *calls == 1; }));
}

TEST(SocketAfterFork, ReportsNoConnectOfTheParentInTheChild) {
  const Testing::FullPort silent;
  const Shared<std::atomic<int>> calls;
  const Ref<System::TcpClientSocket> socket = System::CreateTcpClientSocket();
  socket->AsyncConnect("127.0.0.1", silent.GetPort(), [&calls](const Exception *) { ++*calls; });
  EXPECT_EQ(RunInChild([&] {
              socket->Close();
              EXPECT_TRUE(Testing::DrainIoThreads());
            }),
            "");
  EXPECT_EQ(*calls, 0);
  socket->Close();
  EXPECT_TRUE(Testing::Eventually([&] { return *calls == 1; }));
}

TEST(SocketAfterFork, DoesNotJoinALookupOfTheParent) {
  const ServerProcess server(Echo);
  const Shared<std::atomic<int>> calls;
  const pid_t parent = ::getpid();
  const auto gate = std::make_shared<Testing::Gate>();
  const System::ScopedNameLookup lookup([gate, parent](const std::string &) {
    if (::getpid() == parent) {
      gate->Pass();
    }
    return System::AddressList{boost::asio::ip::address_v4::loopback()};
  });
  const Ref<System::TcpClientSocket> socket = System::CreateTcpClientSocket();
  socket->AsyncConnect("sts.example", server.GetPort(), [&calls](const Exception *) { ++*calls; });
  ASSERT_TRUE(gate->WaitForArrivals(1));
  EXPECT_EQ(RunInChild([&] {
              const Ref<System::TcpClientSocket> own = System::CreateTcpClientSocket();
              Completion connected;
              own->AsyncConnect("sts.example", server.GetPort(), connected.ForEnd());
              EXPECT_EQ(connected.GetMessage(), "");
              socket->Close();
              EXPECT_TRUE(Testing::DrainIoThreads());
              EXPECT_EQ(*calls, 0);
            }),
            "");
  gate->Open();
  EXPECT_TRUE(Testing::Eventually([&] { return *calls == 1; }));
}

TEST(SocketAfterFork, ConnectsInAChildThatACompletionMade) {
  const ServerProcess server(Echo);
  std::string outcome = "never run";
  Testing::EventCount done;
  const Ref<System::TcpClientSocket> socket = System::CreateTcpClientSocket();
  socket->AsyncConnect("127.0.0.1", server.GetPort(), [&](const Exception *) {
    outcome = RunInChild([&] {
      const Ref<System::TcpClientSocket> own = Connect(server.GetPort());
      EXPECT_EQ(Write(*own, "mine"), "");
      EXPECT_EQ(Read(*own), "mine");
    });
    done.Add();
  });
  ASSERT_TRUE(done.WaitFor(1));
  EXPECT_EQ(outcome, "");
  EXPECT_EQ(Write(*socket, "parent"), "");
  EXPECT_EQ(Read(*socket), "parent");
}

// The completion waits at a gate, which the forking thread opens only after the fork.
TEST(Fork, DoesNotWaitForACompletionThatWaitsForTheHost) {
  const ServerProcess server(Echo);
  Testing::Gate gate;
  const Ref<System::TcpClientSocket> socket = System::CreateTcpClientSocket();
  socket->AsyncConnect("127.0.0.1", server.GetPort(), [&](const Exception *) { gate.Pass(); });
  ASSERT_TRUE(gate.WaitForArrivals(1));
  EXPECT_EQ(RunInChild([&] { Connect(server.GetPort()); }), "");
  gate.Open();
  EXPECT_TRUE(Testing::DrainIoThreads());
  EXPECT_EQ(Write(*socket, "parent"), "");
  EXPECT_EQ(Read(*socket), "parent");
}

class TlsAfterFork : public testing::TestWithParam<int> {
protected:
  static TlsSettings Settings() {
    TlsSettings settings;
    settings.minimumVersion = settings.maximumVersion = GetParam();
    return settings;
  }
};

TEST_P(TlsAfterFork, DoesNotUseTheParentsConnectionInTheChild) {
  const ServerProcess server(Echo, Settings());
  auto client = std::make_unique<TlsClient>(CreateTrustingContext(), server.GetPort());
  ASSERT_EQ(client->Handshake(), "");
  EXPECT_EQ(RunInChild([&] {
              EXPECT_EQ(client->Write("child"), OF_PARENT);
              EXPECT_EQ(client->Read(), OF_PARENT);
              EXPECT_EQ(client->Handshake(), OF_PARENT);
              client->GetStream()->Close();
              EXPECT_TRUE(Testing::DrainIoThreads());
            }),
            "");
  EXPECT_EQ(RunInChild([&] { client.reset(); }), "");
  EXPECT_EQ(client->Write("parent"), "");
  EXPECT_EQ(client->Read(), "parent");
}

TEST_P(TlsAfterFork, UsesTheParentsContextInTheChildWithoutItsSessions) {
  const ServerProcess server(Echo, Settings());
  const Ref<Ssl::SSLContext> context = CreateTrustingContext();
  const auto countSessions = [&] { return dynamic_cast<Ssl::SSLContextImpl &>(*context).GetSessions().GetSize(); };
  const auto connect = [&](bool resumed) {
    TlsClient client(context, server.GetPort());
    EXPECT_EQ(client.Handshake(), "");
    EXPECT_EQ(client.Write("hello"), "");
    EXPECT_EQ(client.Read(), "hello");
    EXPECT_EQ(client.GetStream()->WasResumed(), resumed);
    client.GetStream()->Close();
  };
  connect(false);
  const std::size_t sessions = countSessions();
  ASSERT_GT(sessions, 0u);
  const auto connectAndStay = [&] {
    auto open = std::make_unique<TlsClient>(context, server.GetPort());
    EXPECT_EQ(open->Handshake(), "");
    EXPECT_EQ(open->Write("hello"), "");
    EXPECT_EQ(open->Read(), "hello");
    return open;
  };
  const std::unique_ptr<TlsClient> closed = connectAndStay();
  std::unique_ptr<TlsClient> dropped = connectAndStay();
  ASSERT_TRUE(Testing::DrainIoThreads()); // no I/O thread holds a reference to the stream
  const std::size_t left = countSessions();
  EXPECT_EQ(RunInChild([&] {
              EXPECT_EQ(countSessions(), 0u);
              // The child does not keep the sessions of these two connections either.
              closed->GetStream()->Close();
              dropped.reset();
              EXPECT_EQ(countSessions(), 0u);
              connect(false);
              connect(true);
            }),
            "");
  EXPECT_EQ(countSessions(), left);
}

/// Ends a child when its only thread ends. The functions of `atexit` do not run, because they need the parent's other
/// threads.
struct ChildEnder {
  ~ChildEnder() {
    if (isInChild) {
      ::_exit(0);
    }
  }
  bool isInChild = false;
};
thread_local ChildEnder ender;

// Both operations end in one step. The handler that is called first forks, and the child continues that step.
TEST_P(TlsAfterFork, CallsNoFurtherHandlerInAChildThatAHandlerMade) {
  const ServerProcess silent(
      [](ServerConnection &connection) {
        connection.Handshake();
        connection.WaitForInterrupt();
      },
      Settings());
  TlsClient client(CreateTrustingContext(), silent.GetPort());
  ASSERT_EQ(client.Handshake(), "");
  const Shared<std::atomic<int>> calls;
  pid_t child = -1;
  const auto note = [&](std::size_t, const Exception *) {
    ++*calls;
    if (child < 0) {
      child = ::fork();
      ender.isInChild = child == 0;
    }
  };
  char byte = 0;
  const std::string much(16 * 1024 * 1024, 'x'); // more than the connection accepts at once
  client.GetStream()->AsyncReadSome(&byte, 1, note);
  client.GetStream()->AsyncWrite(much.data(), much.size(), note);
  client.GetStream()->Close();
  ASSERT_TRUE(Testing::Eventually([&] { return *calls >= 2; }));
  ASSERT_TRUE(Testing::DrainIoThreads());
  ASSERT_GT(child, 0);
  EXPECT_EQ(Testing::WaitForChild(child), "");
  EXPECT_EQ(*calls, 2);
}

INSTANTIATE_TEST_SUITE_P(Versions, TlsAfterFork, testing::Values(0x0303, 0x0304));

// The parent forks while its threads compute handshakes.
TEST(TlsUnderLoad, ConnectsInEachChildOfABusyParent) {
  if (!Testing::MAY_FORK_WHILE_OTHERS_ALLOCATE) {
    GTEST_SKIP() << "the sanitizer's allocator may stay locked in the child";
  }
  const ServerProcess server(Echo, TlsSettings());
  const Ref<Ssl::SSLContext> context = CreateTrustingContext();
  std::atomic<bool> stop{false};
  const auto work = [&] {
    while (!stop) {
      TlsClient client(context, server.GetPort());
      EXPECT_EQ(client.Handshake(), "");
      client.GetStream()->Close();
    }
  };
  std::thread first(work);
  std::thread second(work);
  for (int i = 0; i < 20; ++i) {
    EXPECT_EQ(RunInChild([&] {
                TlsClient client(context, server.GetPort());
                EXPECT_EQ(client.Handshake(), "");
                EXPECT_EQ(client.Write("hello"), "");
                EXPECT_EQ(client.Read(), "hello");
              }),
              "")
        << i;
  }
  stop = true;
  first.join();
  second.join();
}

} // namespace
} // namespace Tarvel
