// SPDX-License-Identifier: Apache-2.0
// Which callers share a look-up, and how many look-ups run at a time.
#include "system/shared_lookup.h"

#include "support/completion.h"
#include "support/process_resources.h"
#include "support/scripted_server.h"

#include <tarvel/system/stream.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace Tarvel::System {
namespace {

using Testing::Completion;
using Testing::Eventually;
using Testing::PATIENCE;
using Testing::UnusedPort;

using Names = std::vector<std::string>;

/// A started connect to a port that refuses connections.
class Asking {
public:
  explicit Asking(const std::string &host) {
    static const UnusedPort *const port = new UnusedPort;
    m_endpoint = host + ":" + std::to_string(port->GetPort());
    m_socket->AsyncConnect(host, port->GetPort(), m_completion.ForEnd());
    const std::lock_guard<std::mutex> lock(s_mutex);
    s_asked.insert(host);
  }

  /// Returns the names that were asked for since the last call.
  static std::set<std::string> TakeAskedNames() {
    const std::lock_guard<std::mutex> lock(s_mutex);
    return std::exchange(s_asked, {});
  }

  void Close() { m_socket->Close(); }

  int CountCalls() const { return m_completion.GetCalls(); }

  /// How the connect ended: "looked up" after a look-up without failure, else the reason.
  std::string GetOutcome() const {
    const std::string message = m_completion.GetMessage();
    const std::string start = "Cannot connect to " + m_endpoint + ": ";
    if (message.rfind(start, 0) != 0) {
      return message;
    }
    const std::string reason = message.substr(start.size());
    return reason == "Connection refused" ? "looked up" : reason;
  }

private:
  inline static std::mutex s_mutex;
  inline static std::set<std::string> s_asked; // guarded by s_mutex

  std::string m_endpoint;
  Completion m_completion;
  const Ref<TcpClientSocket> m_socket = CreateTcpClientSocket();
};

/// Replaces the resolver. `Hold` makes the look-ups of a name wait until it is released. Each look-up returns the
/// address 127.0.0.1, or fails with the message that `FailWith` has set.
class ResolverStandIn {
public:
  ResolverStandIn()
      : m_state(std::make_shared<State>()),
        m_scope([state = m_state](const std::string &host) { return state->LookUp(host); }) {}
  ResolverStandIn(const ResolverStandIn &) = delete;
  ResolverStandIn &operator=(const ResolverStandIn &) = delete;
  /// Ends all look-ups: the next test must not join one of this test. A look-up calls back after it is no longer
  /// registered, so one more answer for each name shows that those before have ended.
  ~ResolverStandIn() {
    ReleaseAll();
    for (const std::string &name : Asking::TakeAskedNames()) {
      EXPECT_NE(Asking(name).GetOutcome(), "(never called)");
    }
    Asking::TakeAskedNames();
    EXPECT_TRUE(Eventually([this] { return CountRunning() == 0; }));
  }

  void Hold(const std::string &host) {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    m_state->held.insert(host);
  }

  void Release(const std::string &host) {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    m_state->held.erase(host);
    m_state->changed.notify_all();
  }

  void ReleaseAll() {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    m_state->held.clear();
    m_state->changed.notify_all();
  }

  void FailWith(const std::string &message) {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    m_state->failure = message;
  }

  /// The names whose look-ups have begun, in order.
  std::vector<std::string> GetBegun() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->begun;
  }

  std::size_t CountRunning() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->running.size();
  }

  /// Whether two look-ups of one name have ever run at the same time.
  bool HasOverlapped() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->hasOverlapped;
  }

  bool WaitUntilRunning(std::size_t count) const {
    return Eventually([this, count] { return CountRunning() == count; });
  }

private:
  struct State {
    AddressList LookUp(const std::string &host) {
      std::unique_lock<std::mutex> lock(mutex);
      begun.push_back(host);
      hasOverlapped = hasOverlapped || running.count(host) > 0;
      running.insert(host);
      changed.wait_for(lock, PATIENCE, [this, &host] { return held.count(host) == 0; });
      running.erase(running.find(host));
      if (!failure.empty()) {
        throw NetworkException(failure);
      }
      return {boost::asio::ip::make_address("127.0.0.1")};
    }

    std::mutex mutex;
    std::condition_variable changed;
    std::set<std::string> held;
    std::multiset<std::string> running;
    std::vector<std::string> begun;
    std::string failure;
    bool hasOverlapped = false;
  };

  const std::shared_ptr<State> m_state;
  const ScopedNameLookup m_scope;
};

/// Holds names that their test does not use otherwise, and starts a connect to each.
std::vector<Asking> AskForDeadNames(ResolverStandIn &resolver, std::size_t count) {
  std::vector<Asking> dead;
  for (std::size_t i = 0; i < count; ++i) {
    const std::string name = "dead-" + std::to_string(i) + ".example";
    resolver.Hold(name);
    dead.emplace_back(name);
  }
  EXPECT_TRUE(resolver.WaitUntilRunning(count));
  return dead;
}

std::vector<Asking> AskTimes(std::size_t count, const std::string &name) {
  std::vector<Asking> asking;
  for (std::size_t i = 0; i < count; ++i) {
    asking.emplace_back(name);
  }
  return asking;
}

TEST(SharedLookup, ServesAllCallersWithTheSameName) {
  ResolverStandIn resolver;
  resolver.Hold("sts.example");
  const std::vector<Asking> asking = AskTimes(100, "sts.example");
  resolver.ReleaseAll();
  for (const Asking &one : asking) {
    EXPECT_EQ(one.GetOutcome(), "looked up");
  }
  EXPECT_EQ(resolver.GetBegun(), Names{"sts.example"});
}

TEST(SharedLookup, IgnoresTheLetterCaseOfTheName) {
  ResolverStandIn resolver;
  resolver.Hold("Sts.Example");
  const Asking first("Sts.Example");
  const Asking second("sts.EXAMPLE");
  const Asking other("sts.example.");
  resolver.ReleaseAll();
  EXPECT_EQ(first.GetOutcome(), "looked up");
  EXPECT_EQ(second.GetOutcome(), "looked up");
  EXPECT_EQ(other.GetOutcome(), "looked up");
  EXPECT_EQ(resolver.GetBegun().size(), 2u);
}

TEST(SharedLookup, FailsForAllCallersWithTheSameName) {
  ResolverStandIn resolver;
  resolver.Hold("sts.example");
  resolver.FailWith("Name or service not known");
  const std::vector<Asking> asking = AskTimes(10, "sts.example");
  resolver.ReleaseAll();
  for (const Asking &one : asking) {
    EXPECT_EQ(one.GetOutcome(), "Name or service not known");
    EXPECT_EQ(one.CountCalls(), 1);
  }
  EXPECT_EQ(resolver.GetBegun(), Names{"sts.example"});
}

TEST(SharedLookup, DoesNotKeepAFailureForLaterRequests) {
  ResolverStandIn resolver;
  resolver.FailWith("Temporary failure in name resolution");
  EXPECT_EQ(Asking("sts.example").GetOutcome(), "Temporary failure in name resolution");
  resolver.FailWith("");
  EXPECT_EQ(Asking("sts.example").GetOutcome(), "looked up");
  EXPECT_EQ(resolver.GetBegun(), (Names{"sts.example", "sts.example"}));
}

TEST(SharedLookup, DoesNotKeepAnAddressForLaterRequests) {
  ResolverStandIn resolver;
  EXPECT_EQ(Asking("sts.example").GetOutcome(), "looked up");
  resolver.FailWith("Name or service not known");
  EXPECT_EQ(Asking("sts.example").GetOutcome(), "Name or service not known");
  EXPECT_EQ(resolver.GetBegun(), (Names{"sts.example", "sts.example"}));
}

TEST(SharedLookup, ContinuesWhenOneCallerStopsWaiting) {
  ResolverStandIn resolver;
  resolver.Hold("sts.example");
  Asking leaving("sts.example");
  const Asking staying("sts.example");
  leaving.Close();
  EXPECT_EQ(leaving.GetOutcome(), "cancelled");
  resolver.ReleaseAll();
  EXPECT_EQ(staying.GetOutcome(), "looked up");
  EXPECT_EQ(leaving.CountCalls(), 1);
  EXPECT_EQ(resolver.GetBegun(), Names{"sts.example"});
}

TEST(SharedLookup, IsJoinedAfterAllOtherCallersStoppedWaiting) {
  ResolverStandIn resolver;
  resolver.Hold("sts.example");
  for (Asking &one : AskTimes(100, "sts.example")) {
    one.Close();
    EXPECT_EQ(one.GetOutcome(), "cancelled");
  }
  const Asking late("sts.example");
  resolver.ReleaseAll();
  EXPECT_EQ(late.GetOutcome(), "looked up");
  EXPECT_EQ(resolver.GetBegun(), Names{"sts.example"});
}

TEST(SharedLookup, IsForgottenWhenItEndsAfterAllCallersStoppedWaiting) {
  ResolverStandIn resolver;
  resolver.Hold("sts.example");
  Asking gone("sts.example");
  ASSERT_TRUE(resolver.WaitUntilRunning(1));
  gone.Close();
  resolver.FailWith("too late");
  resolver.Release("sts.example");
  ASSERT_TRUE(resolver.WaitUntilRunning(0));
  resolver.FailWith("");
  // The first look-up has its result, but may still be registered: a caller that joins it gets that result.
  EXPECT_TRUE(Eventually([] { return Asking("sts.example").GetOutcome() == "looked up"; }));
  EXPECT_EQ(gone.GetOutcome(), "cancelled");
  EXPECT_EQ(gone.CountCalls(), 1);
}

TEST(SharedLookup, IsNotDelayedBySixtyThreeNamesWithoutAnswer) {
  ASSERT_EQ(MAX_NAME_LOOKUPS, 64u);
  ResolverStandIn resolver;
  const std::vector<Asking> dead = AskForDeadNames(resolver, 63);
  for (int i = 0; i < 10; ++i) {
    const std::vector<Asking> again = AskTimes(10, "dead-" + std::to_string(i) + ".example");
    EXPECT_EQ(Asking("alive-" + std::to_string(i) + ".example").GetOutcome(), "looked up");
    EXPECT_EQ(resolver.CountRunning(), 63u);
  }
}

TEST(SharedLookup, WaitsForAThreadWhileSixtyFourNamesHaveNoAnswer) {
  ResolverStandIn resolver;
  const std::vector<Asking> dead = AskForDeadNames(resolver, 64);
  const std::vector<Asking> waiting = AskTimes(3, "alive.example");
  resolver.Hold("alive.example");
  resolver.Release("dead-7.example");
  EXPECT_EQ(dead[7].GetOutcome(), "looked up");
  ASSERT_TRUE(Eventually([&] { return resolver.GetBegun().back() == "alive.example"; }));
  EXPECT_EQ(resolver.CountRunning(), 64u);
  resolver.Release("alive.example");
  for (const Asking &one : waiting) {
    EXPECT_EQ(one.GetOutcome(), "looked up");
  }
}

TEST(SharedLookup, NeverBeginsWhenAllCallersStopWaitingBeforeItsTurn) {
  ResolverStandIn resolver;
  const std::vector<Asking> dead = AskForDeadNames(resolver, 64);
  std::vector<Asking> leaving = AskTimes(2, "left.example");
  Asking leavingOnce("asked-again.example");
  leavingOnce.Close();
  for (Asking &one : leaving) {
    one.Close();
    EXPECT_EQ(one.GetOutcome(), "cancelled");
  }
  const Asking again("asked-again.example");
  const Asking last("last.example");
  resolver.ReleaseAll();
  EXPECT_EQ(again.GetOutcome(), "looked up");
  EXPECT_EQ(last.GetOutcome(), "looked up");
  Names begun = resolver.GetBegun();
  begun.erase(begun.begin(), begun.begin() + 64);
  std::sort(begun.begin(), begun.end());
  EXPECT_EQ(begun, (Names{"asked-again.example", "last.example"}));
}

TEST(SharedLookup, AnswersEachRequestOfManyThreadsOnce) {
  ResolverStandIn resolver;
  constexpr int THREADS = 64;
  constexpr int ROUNDS = 50;
  std::vector<std::thread> threads;
  std::mutex mutex;
  std::vector<Asking> all;
  for (int thread = 0; thread < THREADS; ++thread) {
    threads.emplace_back([&, thread] {
      for (int round = 0; round < ROUNDS; ++round) {
        Asking asking("name-" + std::to_string((thread + round) % 3) + ".example");
        if ((thread + round) % 2 == 0) {
          asking.Close();
        }
        const std::lock_guard<std::mutex> lock(mutex);
        all.push_back(asking);
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  for (const Asking &one : all) {
    const std::string outcome = one.GetOutcome();
    EXPECT_TRUE(outcome == "looked up" || outcome == "cancelled") << outcome;
  }
  ASSERT_TRUE(Testing::DrainIoThreads());
  for (const Asking &one : all) {
    EXPECT_EQ(one.CountCalls(), 1);
  }
  EXPECT_EQ(all.size(), static_cast<std::size_t>(THREADS * ROUNDS));
  EXPECT_FALSE(resolver.HasOverlapped());
}

} // namespace
} // namespace Tarvel::System
