// SPDX-License-Identifier: Apache-2.0
// Operations with cancels and deadlines at random moments: each has one outcome, and memory, descriptors and threads
// do not grow.

#include "integration/client/fault_service.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"
#include "support/repetitions.h"
#include "support/sanitized.h"

#include <gtest/gtest.h>

#include <malloc.h>

#include <atomic>
#include <chrono>
#include <deque>
#include <memory>
#include <random>
#include <string>
#include <thread>
#include <utility>

namespace SsoClient {
namespace {

using namespace Testing;

constexpr std::size_t MOST_UNDER_WAY = 64;

/// Answers most requests at once, some after a millisecond, and some never.
ScriptedServer::Script Unsteady() {
  const auto count = std::make_shared<std::atomic<unsigned>>(0);
  return [count](ServerConnection &peer) {
    const unsigned number = (*count)++;
    if (number % 10 == 3) {
      peer.Stall(); // not even a handshake
      return;
    }
    if (!peer.Handshake()) {
      return;
    }
    peer.ReadRequest();
    if (number % 10 == 7) {
      peer.Stall();
      return;
    }
    if (number % 10 == 5) {
      std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    peer.Write(TokenResponse());
  };
}

/// The bytes that the process has allocated and not released. The resident memory would also depend on how the C library
/// divides the memory between the threads.
std::size_t AllocatedBytes() {
  const struct mallinfo2 heap = ::mallinfo2();
  return heap.uordblks + heap.hblkhd;
}

/// One operation that is under way.
struct UnderWay {
  CancelSource source;
  std::shared_ptr<std::atomic<int>> outcomes;
};

class Soak {
public:
  explicit Soak(bool isSecure) : m_service(Unsteady(), isSecure), m_client(m_service.CreateClient()) {}

  void Run(int operations) {
    for (int i = 0; i < operations; ++i) {
      Start();
      if (m_random() % 2 == 0) {
        m_underWay[m_random() % m_underWay.size()].source.Cancel();
      }
      if (m_underWay.size() == MOST_UNDER_WAY) {
        Finish();
      }
    }
    while (!m_underWay.empty()) {
      Finish();
    }
  }

  /// Waits until the service has released its connections and the client's I/O threads have finished their work. Returns
  /// false if this does not happen in time.
  bool IsQuiet() const {
    return Eventually([this] { return m_service.GetServer().GetRetainedCount() == 0; }) && DrainIoThreads();
  }

  std::string AcquireFromTheRepairedService() {
    m_service.Repair();
    return OutcomeOf([this] { return m_client->Acquire(AnyCredential(), AnySpec()); });
  }

  int CountTokens() const { return m_counts->tokens; }
  int CountCancelled() const { return m_counts->cancelled; }
  int CountLate() const { return m_counts->late; }
  std::string GetUnexpected() const { return m_counts->unexpected; }

private:
  struct Counts {
    std::atomic<int> tokens{0};
    std::atomic<int> cancelled{0};
    std::atomic<int> late{0};
    std::mutex mutex;
    std::string unexpected;
  };

  void Start() {
    UnderWay operation;
    operation.outcomes = std::make_shared<std::atomic<int>>(0);
    CallOptions options;
    options.cancelToken = operation.source.GetToken();
    if (m_random() % 3 == 0) {
      options.deadline = CallOptions::Clock::now() + std::chrono::microseconds(m_random() % 20'000);
    }
    m_client->AcquireAsync(AnyCredential(), AnySpec(), options,
                           [counts = m_counts, outcomes = operation.outcomes](const TokenOutcome &outcome) {
                             Count(*counts, outcome);
                             ++*outcomes;
                             outcomes->notify_all();
                           });
    m_underWay.push_back(std::move(operation));
  }

  static void Count(Counts &counts, const TokenOutcome &outcome) {
    const std::string text = OutcomeOf([&outcome] { return outcome.Get(); });
    if (text == "token") {
      ++counts.tokens;
    } else if (text == CANCELLED) {
      ++counts.cancelled;
    } else if (text == LATE) {
      ++counts.late;
    } else {
      const std::lock_guard<std::mutex> lock(counts.mutex);
      counts.unexpected += text + "\n";
    }
  }

  /// Cancels the oldest operation, because the service may be silent, and waits for its outcome.
  void Finish() {
    const UnderWay &oldest = m_underWay.front();
    oldest.source.Cancel();
    oldest.outcomes->wait(0);
    m_finished.push_back(oldest.outcomes);
    m_underWay.pop_front();
    if (m_finished.size() > MOST_UNDER_WAY) {
      EXPECT_EQ(*m_finished.front(), 1); // a second outcome would have arrived by now
      m_finished.pop_front();
    }
  }

  FaultService m_service;
  const std::unique_ptr<TokenClient> m_client;
  const std::shared_ptr<Counts> m_counts = std::make_shared<Counts>();
  std::minstd_rand m_random{20261123};
  std::deque<UnderWay> m_underWay;
  std::deque<std::shared_ptr<std::atomic<int>>> m_finished;
};

class ClientSoak : public testing::TestWithParam<bool> {};

TEST_P(ClientSoak, HasOneOutcomeForEachOperationAndDoesNotGrow) {
  const int operations = Repetitions(100'000, IS_SANITIZED ? 300 : 1'000);
  constexpr std::size_t TOLERANCE = std::size_t{2} * 1024 * 1024;
  Soak soak(GetParam());
  const int warmUp = operations / 5;
  soak.Run(warmUp);
  ASSERT_TRUE(soak.IsQuiet());
  const std::size_t memory = AllocatedBytes();
  const std::size_t descriptors = CountDescriptors();
  const std::size_t threads = CountThreads();

  soak.Run(operations - warmUp);
  ASSERT_TRUE(soak.IsQuiet());
  EXPECT_EQ(soak.GetUnexpected(), "");
  EXPECT_EQ(soak.CountTokens() + soak.CountCancelled() + soak.CountLate(), operations);
  EXPECT_EQ(soak.AcquireFromTheRepairedService(), "token");
  EXPECT_TRUE(Eventually([&] { return CountDescriptors() <= descriptors; })) << CountDescriptors();
  EXPECT_TRUE(Eventually([&] { return CountThreads() <= threads; })) << CountThreads();
  if (!IS_SANITIZED) { // a sanitizer has its own allocator
    EXPECT_TRUE(Eventually([&] { return AllocatedBytes() <= memory + TOLERANCE; })) << AllocatedBytes() - memory;
  }
  RecordProperty("tokens", soak.CountTokens());
  RecordProperty("cancelled", soak.CountCancelled());
  RecordProperty("late", soak.CountLate());
}

INSTANTIATE_TEST_SUITE_P(Over, ClientSoak, testing::Bool(), [](const testing::TestParamInfo<bool> &test) {
  return std::string(test.param ? "Tls" : "Tcp");
});

} // namespace
} // namespace SsoClient
