// SPDX-License-Identifier: Apache-2.0
// No thread left. Each test runs in its own process, and begins with the first use of the network there.
#include "outcome.h"

#include "support/data_file.h"
#include "support/posting_server.h"
#include "support/soap_responses.h"

#include <tarvel/system/stream.h>
#include <tarvel/system/thread_pool.h>

#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <future>
#include <iostream>
#include <string>
#include <system_error>
#include <thread>
#include <vector>

namespace {

/// How many threads can still be started.
std::atomic<int> g_threadsLeft{1000000};

} // namespace

// The linker calls this in place of the standard library's function.
#define START_THREAD "_ZNSt6thread15_M_start_threadESt10unique_ptrINS_6_StateESt14default_deleteIS1_EEPFvvE"

void RealStartThread(std::thread *thread, void *state, void (*depend)()) asm("__real_" START_THREAD);
void LimitedStartThread(std::thread *thread, void *state, void (*depend)()) asm("__wrap_" START_THREAD);
void LimitedStartThread(std::thread *thread, void *state, void (*depend)()) {
  if (g_threadsLeft-- <= 0) {
    throw std::system_error(EAGAIN, std::generic_category());
  }
  RealStartThread(thread, state, depend);
}

namespace Testing {
namespace {

const char *const NO_THREAD =
    "Tarvel::InvalidStateException: Cannot start a thread: Resource temporarily unavailable\n";
const char *const ALICE = "{Name: alice; Domain:corp.example}\n";

/// A service on loopback, and a limit on the threads that are started from now on.
class ServiceWorld {
public:
  void AllowThreads(int count) { g_threadsLeft = count; }
  void AllowAllThreads() { g_threadsLeft = 1000000; }

  /// A client that reaches the service by `host`: its address or its name.
  ServicePtr GetService(const std::string &host = "127.0.0.1") const {
    std::string url = m_server.GetUrl();
    return ServiceAt(url.replace(url.find("localhost"), 9, host));
  }

private:
  const PostingServer m_server{std::vector<std::string>(10, IssueResponse(ReadDataFile("tokens/bearer.xml")))};
};

[[noreturn]] void ReportWithoutIoThread() {
  ServiceWorld world;
  world.AllowThreads(0);
  std::cerr << Acquire(world.GetService()) << "\n";
  world.AllowThreads(1); // for the pool
  std::cerr << AcquireAsynchronously(world.GetService()) << "\n";
  world.AllowAllThreads();
  std::cerr << Acquire(world.GetService()) << "\n" << AcquireAsynchronously(world.GetService()) << "\n";
  std::_Exit(0);
}

TEST(NoThreadDeathTest, FailsTheFirstUseOfTheNetworkButNoLaterOne) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  EXPECT_EXIT(ReportWithoutIoThread(), testing::ExitedWithCode(0),
              testing::Eq(std::string(NO_THREAD) + NO_THREAD + ALICE + ALICE));
}

[[noreturn]] void ReportWithoutPoolThread() {
  ServiceWorld world;
  world.AllowThreads(0);
  std::cerr << AcquireAsynchronously(world.GetService()) << "\n";
  world.AllowAllThreads();
  std::cerr << AcquireAsynchronously(world.GetService()) << "\n";
  std::_Exit(0);
}

TEST(NoThreadDeathTest, MakesTheStartOfAnAsynchronousOperationThrow) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  EXPECT_EXIT(ReportWithoutPoolThread(), testing::ExitedWithCode(0),
              testing::Eq(std::string("thrown ") + NO_THREAD + ALICE));
}

[[noreturn]] void ReportWithOneIoThread() {
  ServiceWorld world;
  world.AllowThreads(1);
  Tarvel::System::CreateTcpClientSocket();
  world.AllowAllThreads();
  std::cerr << Acquire(world.GetService()) << "\n" << AcquireAsynchronously(world.GetService()) << "\n";
  std::_Exit(0);
}

TEST(NoThreadDeathTest, HasNoEffectWhenOneOfTwoNetworkThreadsRuns) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  EXPECT_EXIT(ReportWithOneIoThread(), testing::ExitedWithCode(0), testing::Eq(std::string(ALICE) + ALICE));
}

[[noreturn]] void ReportWithoutLookupThread() {
  ServiceWorld world;
  std::cerr << Acquire(world.GetService()) << "\n";
  world.AllowThreads(0);
  for (int i = 0; i < 2; ++i) {
    std::string outcome = Acquire(world.GetService("localhost"));
    const std::size_t port = outcome.find("localhost:") + 10;
    std::cerr << outcome.erase(port, outcome.find(':', port) - port) << "\n";
  }
  world.AllowAllThreads();
  std::cerr << Acquire(world.GetService("localhost")) << "\n";
  std::_Exit(0);
}

TEST(NoThreadDeathTest, FailsTheConnectThatNeedsTheResolver) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  const std::string failure = "SsoClient::CommunicationException: Cannot connect to localhost:: "
                              "Cannot start a thread: Resource temporarily unavailable\n";
  EXPECT_EXIT(ReportWithoutLookupThread(), testing::ExitedWithCode(0), testing::Eq(ALICE + failure + failure + ALICE));
}

} // namespace
} // namespace Testing
