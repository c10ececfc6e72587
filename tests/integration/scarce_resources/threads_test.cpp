// SPDX-License-Identifier: Apache-2.0
// No thread left. Each test runs in its own process, and begins with the first use of the network there.
#include "outcome.h"

#include "support/data_file.h"
#include "support/operation_forms.h"
#include "support/posting_server.h"
#include "support/process_resources.h"
#include "support/service_stand_ins.h"
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
  ServicePtr GetService(const std::string &host = "127.0.0.1") const { return ServiceAt(GetUrl(host)); }
  /// The configuration of a client that reaches the service by its address.
  SsoClient::SecurityTokenServiceConfig GetConfig() const { return ConfigFor(GetUrl("127.0.0.1")); }

private:
  std::string GetUrl(const std::string &host) const {
    std::string url = m_server.GetUrl();
    return url.replace(url.find("localhost"), 9, host);
  }

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

/// The outcome of each form, one on each line: the subject of the token, or the class and message of the exception.
std::string OutcomesOfForms(const SsoClient::TokenClient &client) {
  const SsoClient::Credential credential = SsoClient::PasswordCredential{"alice", Tarvel::SecretText("secret")};
  std::string outcomes;
  for (const Form form : AllForms()) {
    try {
      outcomes += Acquire(form, client, credential, SpecFor(3600))->GetSubject().ToString() + "\n";
    } catch (const Tarvel::InvalidStateException &failure) {
      outcomes += std::string("Tarvel::InvalidStateException: ") + failure.what() + "\n";
    } catch (const std::exception &failure) {
      outcomes += std::string("another exception: ") + failure.what() + "\n";
    }
  }
  return outcomes;
}

[[noreturn]] void ReportClientWithoutThread() {
  ServiceWorld world;
  const SsoClient::TokenClient client(world.GetConfig());
  world.AllowThreads(0);
  std::cerr << OutcomesOfForms(client);
  world.AllowAllThreads();
  std::cerr << OutcomesOfForms(client);
  std::_Exit(0);
}

TEST(NoThreadDeathTest, FailsEachFormOfTheClientUntilThereIsOne) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  std::string failures;
  std::string successes;
  for (std::size_t i = 0; i < AllForms().size(); ++i) {
    failures += NO_THREAD;
    successes += ALICE;
  }
  EXPECT_EXIT(ReportClientWithoutThread(), testing::ExitedWithCode(0), testing::Eq(failures + successes));
}

[[noreturn]] void ReportSourceWithoutThread() {
  ServiceWorld world;
  SsoClient::TokenSourceOptions options;
  options.firstBackOff = options.longestBackOff = std::chrono::milliseconds(1);
  const SsoClient::TokenSource source(
      std::make_shared<const SsoClient::TokenClient>(world.GetConfig()),
      []() -> SsoClient::Credential {
        return SsoClient::PasswordCredential{"alice", Tarvel::SecretText("secret")};
      },
      SpecFor(3600), options);
  world.AllowThreads(0);
  try {
    source.Get();
  } catch (const std::exception &failure) {
    std::cerr << failure.what() << "\n";
  }
  world.AllowAllThreads();
  const bool hasToken = Eventually([&source] {
    try {
      return source.Get() != nullptr;
    } catch (const Tarvel::InvalidStateException &) { // within the back-off
      return false;
    }
  });
  std::cerr << (hasToken ? "a token\n" : "no token\n");
  std::_Exit(0);
}

TEST(NoThreadDeathTest, FailsATokenSourceUntilThereIsOne) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  EXPECT_EXIT(ReportSourceWithoutThread(), testing::ExitedWithCode(0),
              testing::Eq("Cannot start a thread: Resource temporarily unavailable\na token\n"));
}

} // namespace
} // namespace Testing
