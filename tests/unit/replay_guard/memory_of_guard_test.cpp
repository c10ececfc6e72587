// SPDX-License-Identifier: Apache-2.0
#include "guarded_clock.h"

#include "support/allocated_bytes.h"

#include <ssoclient/proof/replay_guard.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>

namespace ReplayGuardTest {
namespace {

using Answer = SsoClient::ReplayGuard::Answer;

constexpr std::int64_t NOW = 1'700'000'000'000'000;
constexpr std::size_t BYTES_FOR_EACH = 32;
constexpr std::size_t OTHER_BYTES = 1024;

TEST(MemoryOfReplayGuard, IsAtMostThirtyTwoBytesForEachMessage) {
  for (const std::size_t capacity : {1U, 2U, 10U, 1000U, 1'000'000U}) {
    const std::size_t before = Testing::CountAllocatedBytes();
    const auto guard = SsoClient::CreateMemoryReplayGuard(capacity);
    EXPECT_LE(Testing::CountAllocatedBytes() - before, BYTES_FOR_EACH * capacity + OTHER_BYTES) << capacity;
    if (!Testing::IS_SANITIZED) {
      EXPECT_GE(Testing::CountAllocatedBytes() - before, 24 * capacity);
    }
  }
}

TEST(MemoryOfReplayGuard, DoesNotGrow) {
  SetClock clock(NOW);
  const auto guard = SsoClient::CreateMemoryReplayGuard(10'000);
  const std::size_t before = Testing::CountAllocatedBytes();
  for (std::uint64_t i = 0; i < 40'000; ++i) {
    clock.Set(NOW + static_cast<std::int64_t>(i));
    ASSERT_EQ(guard->Remember(MakeIdentifier(i), At(clock.Get() + 7'000)), Answer::FIRST);
  }
  EXPECT_EQ(Testing::CountAllocatedBytes(), before);
}

} // namespace
} // namespace ReplayGuardTest
