// SPDX-License-Identifier: Apache-2.0
// Many operations that end at random moments: each has exactly one outcome, and leaves nothing in memory.
#include "client_setup.h"
#include "support/recorded_events.h"
#include "support/sanitized.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <mutex>
#include <random>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using std::chrono::microseconds;
using Testing::ClientOn;
using Testing::ScriptedTransport;

constexpr int OPERATIONS = Testing::IS_SANITIZED ? 2000 : 20000;
constexpr int THREADS = 4;

/// Counts the starts and the ends of operations.
class CountingObserver final : public OperationObserver {
public:
  void OnStarted(const OperationInfo &) override { ++started; }
  void OnEnded(const OperationInfo &, const OperationEndedEvent &) override { ++ended; }

  std::atomic<int> started{0};
  std::atomic<int> ended{0};
};

/// How often the callback of an operation was called.
struct Calls {
  std::atomic<int> outcomes{0};
};

/// Starts operations on one thread, and ends many of them early.
class RandomCaller {
public:
  RandomCaller(std::shared_ptr<const ScriptedTransport> transport, std::shared_ptr<CountingObserver> observer,
               unsigned seed)
      : m_transport(std::move(transport)), m_observer(std::move(observer)), m_random(seed) {}

  void Run(int operations) {
    for (int i = 0; i < operations; ++i) {
      if (!m_client || Chance(50)) {
        Testing::ClientParts parts;
        parts.options.service.observer = m_observer;
        m_client = ClientOn(m_transport, parts); // destroys the earlier client, with its operations
      }
      StartOne();
      if (!m_sources.empty() && Chance(2)) {
        const std::size_t chosen = m_random() % m_sources.size();
        m_sources[chosen].Cancel();
        m_sources.erase(m_sources.begin() + static_cast<std::ptrdiff_t>(chosen));
      }
      if (Chance(16)) {
        m_transport->AnswerHeld(Testing::Success("issued:" + Testing::BearerXml()));
      }
    }
    m_client = nullptr;
  }

  std::vector<std::shared_ptr<Calls>> calls;

private:
  bool Chance(unsigned oneIn) { return m_random() % oneIn == 0; }

  void StartOne() {
    CallOptions options;
    if (Chance(2)) {
      const CancelSource source;
      m_sources.push_back(source);
      options.cancelToken = source.GetToken();
    }
    if (Chance(3)) {
      options.deadline = CallOptions::Clock::now() + microseconds(m_random() % 2000);
    }
    if (Chance(4)) {
      options.executor = [](std::function<void()> function) { function(); };
    }
    const auto called = std::make_shared<Calls>();
    calls.push_back(called);
    Credential credential = Testing::Alice();
    if (Chance(4)) {
      credential = NegotiationCredential{[] {
        return std::make_shared<Testing::NegotiationHandlerStandIn>(
            std::vector<std::shared_ptr<Testing::Bytes>>(3, Testing::Leg("leg")));
      }};
    }
    m_client->AcquireAsync(credential, Testing::SpecFor(60), options,
                           [called](const TokenOutcome &) { ++called->outcomes; });
  }

  const std::shared_ptr<const ScriptedTransport> m_transport;
  const std::shared_ptr<CountingObserver> m_observer;
  std::minstd_rand m_random;
  std::shared_ptr<TokenClient> m_client;
  std::vector<CancelSource> m_sources;
};

boost::optional<Testing::Reply> AnswerSome(const Request &request, int number) {
  if (request.body.find("SPNego") != std::string::npos) {
    return Testing::Success(number % 2 == 0 ? "leg:ctx|go on|" : "leg:ctx|end|" + Testing::BearerXml());
  }
  switch (number % 4) {
  case 0:
    return boost::none;
  case 1:
    return Testing::NoConnection();
  default:
    return Testing::Success("issued:" + Testing::BearerXml());
  }
}

TEST(RandomOperations, HaveOneOutcomeEachAndLeaveNothing) {
  const auto transport = std::make_shared<ScriptedTransport>(AnswerSome);
  const auto observer = std::make_shared<CountingObserver>();
  std::vector<std::unique_ptr<RandomCaller>> callers;
  std::vector<std::thread> threads;
  for (unsigned i = 0; i < THREADS; ++i) {
    callers.push_back(std::make_unique<RandomCaller>(transport, observer, 1000 + i));
    threads.emplace_back([&caller = *callers.back()] { caller.Run(OPERATIONS / THREADS); });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  int started = 0;
  for (const auto &caller : callers) {
    for (const auto &called : caller->calls) {
      ++started;
      EXPECT_TRUE(Testing::Eventually([&] { return called.use_count() == 1; })); // the callback has been released
      EXPECT_EQ(called->outcomes, 1);
    }
  }
  EXPECT_EQ(started, OPERATIONS);
  EXPECT_EQ(observer->started, OPERATIONS);
  EXPECT_EQ(observer->ended, OPERATIONS);
  transport->AnswerHeld(Testing::NoConnection());
  EXPECT_TRUE(Testing::Eventually([&] { return transport->CountOpenSessions() == 0; }));
}

} // namespace
} // namespace SsoClient
