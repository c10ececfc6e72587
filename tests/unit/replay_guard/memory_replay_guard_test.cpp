// SPDX-License-Identifier: Apache-2.0
#include "guarded_clock.h"

#include "support/forked.h"
#include "support/throws_message.h"

#include <ssoclient/proof/replay_guard.h>
#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <atomic>
#include <limits>
#include <thread>
#include <vector>

namespace ReplayGuardTest {
namespace {

using Answer = SsoClient::ReplayGuard::Answer;
using SsoClient::CreateMemoryReplayGuard;

constexpr std::int64_t NOW = 1'700'000'000'000'000;
constexpr std::int64_t LATER = NOW + 1'000'000;

TEST(MemoryReplayGuard, RemembersAMessage) {
  const SetClock clock(NOW);
  const auto guard = CreateMemoryReplayGuard(10);
  EXPECT_EQ(guard->Remember(MakeIdentifier(1), At(LATER)), Answer::FIRST);
  EXPECT_EQ(guard->Remember(MakeIdentifier(2), At(LATER)), Answer::FIRST);
  EXPECT_EQ(guard->Remember(MakeIdentifier(1), At(LATER)), Answer::REPEATED);
  EXPECT_EQ(guard->Remember(MakeIdentifier(2), At(LATER)), Answer::REPEATED);
}

TEST(MemoryReplayGuard, ComparesEveryOctetOfIdentifiers) {
  const SetClock clock(NOW);
  const auto guard = CreateMemoryReplayGuard(300);
  EXPECT_EQ(guard->Remember({}, At(LATER)), Answer::FIRST);
  for (std::size_t bit = 0; bit < 256; ++bit) {
    SsoClient::MessageIdentifier identifier{};
    identifier[bit / 8] = static_cast<std::uint8_t>(1 << bit % 8);
    EXPECT_EQ(guard->Remember(identifier, At(LATER)), Answer::FIRST) << bit;
  }
}

TEST(MemoryReplayGuard, RemembersUpToTheMicrosecondBeforeTheTime) {
  SetClock clock(NOW);
  const auto guard = CreateMemoryReplayGuard(1);
  EXPECT_EQ(guard->Remember(MakeIdentifier(1), At(LATER)), Answer::FIRST);
  clock.Set(LATER - 1);
  EXPECT_EQ(guard->Remember(MakeIdentifier(1), At(LATER)), Answer::REPEATED);
  EXPECT_EQ(guard->Remember(MakeIdentifier(2), At(LATER + 1)), Answer::UNAVAILABLE);
  clock.Set(LATER);
  EXPECT_EQ(guard->Remember(MakeIdentifier(2), At(LATER + 1)), Answer::FIRST);
}

TEST(MemoryReplayGuard, AnswersUnavailableToMoreThanItsCapacity) {
  const SetClock clock(NOW);
  for (const std::size_t capacity : {1U, 2U, 3U, 4U, 5U, 7U, 8U, 9U, 100U, 10'000U}) {
    const auto guard = CreateMemoryReplayGuard(capacity);
    for (std::size_t i = 0; i < capacity; ++i) {
      ASSERT_EQ(guard->Remember(MakeIdentifier(i), At(LATER)), Answer::FIRST) << i << " of " << capacity;
    }
    EXPECT_EQ(guard->Remember(MakeIdentifier(capacity), At(LATER)), Answer::UNAVAILABLE) << capacity;
    EXPECT_EQ(guard->Remember(MakeIdentifier(capacity), At(LATER)), Answer::UNAVAILABLE) << capacity;
    EXPECT_EQ(guard->Remember(MakeIdentifier(capacity - 1), At(LATER)), Answer::REPEATED) << capacity;
  }
}

TEST(MemoryReplayGuard, RemembersNoMessageWhoseTimeIsNotInTheFuture) {
  const SetClock clock(NOW);
  const auto guard = CreateMemoryReplayGuard(1);
  for (const std::int64_t past : {NOW, NOW - 1, std::int64_t{0}, -LATER, std::numeric_limits<std::int64_t>::min()}) {
    EXPECT_EQ(guard->Remember(MakeIdentifier(1), At(past)), Answer::UNAVAILABLE) << past;
  }
  EXPECT_EQ(guard->Remember(MakeIdentifier(1), At(NOW + 1)), Answer::FIRST);
}

TEST(MemoryReplayGuard, RemembersTheLatestTime) {
  SetClock clock(NOW);
  const auto guard = CreateMemoryReplayGuard(1);
  EXPECT_EQ(guard->Remember(MakeIdentifier(1), At(std::numeric_limits<std::int64_t>::max())), Answer::FIRST);
  clock.Set(std::numeric_limits<std::int64_t>::max() / 1000);
  EXPECT_EQ(guard->Remember(MakeIdentifier(1), At(std::numeric_limits<std::int64_t>::max())), Answer::REPEATED);
}

TEST(MemoryReplayGuard, AnswersNoMessageFirstTwiceWhenTheClockIsSetForwardAndBack) {
  SetClock clock(NOW);
  const auto guard = CreateMemoryReplayGuard(4);
  EXPECT_EQ(guard->Remember(MakeIdentifier(1), At(LATER)), Answer::FIRST);
  clock.Set(LATER + 1);
  EXPECT_EQ(guard->Remember(MakeIdentifier(2), At(LATER + 10)), Answer::FIRST); // and the first message is removed
  clock.Set(NOW);
  EXPECT_EQ(guard->Remember(MakeIdentifier(1), At(LATER)), Answer::UNAVAILABLE);
  EXPECT_EQ(guard->Remember(MakeIdentifier(3), At(LATER)), Answer::UNAVAILABLE);
  EXPECT_EQ(guard->Remember(MakeIdentifier(2), At(LATER + 10)), Answer::REPEATED);
  EXPECT_EQ(guard->Remember(MakeIdentifier(3), At(LATER + 1)), Answer::FIRST);
}

TEST(MemoryReplayGuard, RemovesOnlyAFewOfManyExpiredMessagesInACall) {
  constexpr std::uint64_t MESSAGES = 10'000;
  constexpr std::uint64_t CALLS = 20; // one call may find only empty slots, because the key of the hash is random
  constexpr std::uint64_t MAX_REMOVED_IN_A_CALL = 9;
  SetClock clock(NOW);
  const auto guard = CreateMemoryReplayGuard(2 * MESSAGES);
  for (std::uint64_t i = 0; i < MESSAGES; ++i) {
    ASSERT_EQ(guard->Remember(MakeIdentifier(i), At(LATER)), Answer::FIRST);
  }
  clock.Set(LATER);
  for (std::uint64_t i = 0; i < CALLS; ++i) {
    EXPECT_EQ(guard->Remember(MakeIdentifier(MESSAGES + i), At(LATER + 1)), Answer::FIRST);
  }
  clock.Set(NOW);
  std::uint64_t removed = 0;
  for (std::uint64_t i = 0; i < MESSAGES; ++i) {
    removed += guard->Remember(MakeIdentifier(i), At(LATER)) == Answer::UNAVAILABLE ? 1U : 0U;
  }
  EXPECT_LE(removed, CALLS * MAX_REMOVED_IN_A_CALL);
  EXPECT_GT(removed, 0U);
}

TEST(MemoryReplayGuard, HasAPlaceWhileFourFifthsHaveNotExpired) {
  std::vector<std::int64_t> capacities = {100, 1000, 5000};
  for (std::int64_t small = 1; small <= 40; ++small) {
    capacities.push_back(small);
  }
  for (const std::int64_t capacity : capacities) {
    SetClock clock(NOW);
    const auto guard = CreateMemoryReplayGuard(static_cast<std::size_t>(capacity));
    // In each microsecond one message arrives and one expires. Every tenth round, all of them expire at once.
    const std::int64_t live = capacity == 1 ? 1 : capacity * 4 / 5;
    for (std::int64_t i = 0; i < 30 * capacity; ++i) {
      const bool expiresWithOthers = i / capacity % 10 == 9;
      const std::int64_t until = NOW + (expiresWithOthers ? (i / live + 1) * live : i + live);
      clock.Set(NOW + i);
      ASSERT_EQ(guard->Remember(MakeIdentifier(static_cast<std::uint64_t>(i)), At(until)), Answer::FIRST)
          << i << " of " << capacity;
    }
  }
}

TEST(MemoryReplayGuard, AnswersFirstToOneOfSeveralThreads) {
  constexpr int THREADS = 8;
  constexpr std::uint64_t MESSAGES = 5000;
  const SetClock clock(NOW);
  const auto guard = CreateMemoryReplayGuard(MESSAGES);
  std::vector<std::atomic<int>> firsts(MESSAGES);
  std::atomic<int> unavailable = 0;
  std::vector<std::thread> threads;
  for (int i = 0; i < THREADS; ++i) {
    threads.emplace_back([&] {
      for (std::uint64_t message = 0; message < MESSAGES; ++message) {
        const Answer answer = guard->Remember(MakeIdentifier(message), At(LATER));
        firsts[message] += answer == Answer::FIRST ? 1 : 0;
        unavailable += answer == Answer::UNAVAILABLE ? 1 : 0;
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(unavailable, 0);
  for (const std::atomic<int> &count : firsts) {
    EXPECT_EQ(count, 1);
  }
}

TEST(MemoryReplayGuard, WorksInAChildWhileOtherThreadsOfTheParentUseIt) {
  const SetClock clock(NOW);
  const auto guard = CreateMemoryReplayGuard(1'000'000);
  EXPECT_EQ(guard->Remember(MakeIdentifier(0), At(LATER)), Answer::FIRST);
  std::atomic<bool> isEnding = false;
  std::thread other([&] {
    for (std::uint64_t i = 1; !isEnding; ++i) {
      guard->Remember(MakeIdentifier(i % 100'000), At(LATER));
    }
  });
  for (std::uint64_t child = 0; child < 20; ++child) {
    EXPECT_EQ(Testing::RunInChild([&] {
                EXPECT_EQ(guard->Remember(MakeIdentifier(0), At(LATER)), Answer::REPEATED);
                EXPECT_EQ(guard->Remember(MakeIdentifier(200'000 + child), At(LATER)), Answer::FIRST);
                EXPECT_EQ(guard->Remember(MakeIdentifier(200'000 + child), At(LATER)), Answer::REPEATED);
              }),
              "");
    EXPECT_EQ(guard->Remember(MakeIdentifier(200'000 + child), At(LATER)), Answer::FIRST);
  }
  isEnding = true;
  other.join();
}

TEST(CreateMemoryReplayGuard, RefusesCapacitiesOutOfRange) {
  constexpr const char *REFUSAL = "Invalid argument : capacity must be from 1 to 100000000";
  EXPECT_THROWS_MESSAGE(CreateMemoryReplayGuard(0), Tarvel::InvalidArgumentException, REFUSAL);
  EXPECT_THROWS_MESSAGE(CreateMemoryReplayGuard(SsoClient::MAX_MEMORY_REPLAY_GUARD_CAPACITY + 1),
                        Tarvel::InvalidArgumentException, REFUSAL);
  EXPECT_THROWS_MESSAGE(CreateMemoryReplayGuard(std::numeric_limits<std::size_t>::max()),
                        Tarvel::InvalidArgumentException, REFUSAL);
}

} // namespace
} // namespace ReplayGuardTest
