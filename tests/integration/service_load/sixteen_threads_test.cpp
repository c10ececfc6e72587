// SPDX-License-Identifier: Apache-2.0
// One service, used from sixteen threads at once over TLS.
#include "integration/service_load/canned_service.h"
#include "support/allocated_bytes.h"
#include "support/completion.h"
#include "support/forked.h"
#include "support/operations_in_turn.h"
#include "support/process_resources.h"
#include "support/repetitions.h"
#include "support/sanitized.h"

#include <gtest/gtest.h>

#include <openssl/crypto.h>

#include <memory>
#include <string>

namespace SsoClient {
namespace {

using Testing::CountAllocatedBytes;
using Testing::CountDescriptors;

/// The heap may grow a little, because the cached TLS sessions differ in size, and client and service are both in this
/// process. A leak of seven bytes in each of 20,000 operations would be more.
constexpr std::size_t MAX_GROWTH_BYTES = 131072;

TEST(OneServiceOnSixteenThreadsOverTls, RunsTwentyThousandOperationsWithoutErrorOrGrowth) {
  const int count = Testing::Repetitions(20000, 2000);
  constexpr int FIRST = 800; // afterwards everything that is made only once exists
  const Testing::CannedService server;
  const auto allEnded = [&] { return server.CountOpenConnections() == 0; };
  const auto service = CreateSecurityTokenService(server.GetConfig());
  const auto held = Testing::HeldToken();
  Testing::OperationsInTurn operations(*service, "alice", *held);
  operations.RunOnSixteenThreads(FIRST);
  ASSERT_EQ(operations.GetFailure(), "");
  ASSERT_TRUE(Testing::Eventually(allEnded));
  ASSERT_TRUE(Testing::DrainIoThreads());

  const std::size_t bytes = CountAllocatedBytes();
  const std::size_t descriptors = CountDescriptors();
  operations.RunOnSixteenThreads(count);
  EXPECT_EQ(operations.GetFailure(), "");
  EXPECT_EQ(operations.CountSuccesses(), FIRST + count);
  EXPECT_EQ(server.CountConnections(), FIRST + count);
  ASSERT_TRUE(Testing::Eventually(allEnded));
  EXPECT_TRUE(Testing::Eventually([&] { return CountDescriptors() <= descriptors; })) << CountDescriptors();
  EXPECT_TRUE(Testing::Eventually([&] { return CountAllocatedBytes() <= bytes + MAX_GROWTH_BYTES; }))
      << CountAllocatedBytes() << " bytes, after " << bytes;
}

// The measurement of growth must include each library's memory, and notice when it is freed.
TEST(AllocatedBytes, CountTheAllocationsOfEveryLibraryUntilTheyAreFreed) {
  if (Testing::IS_SANITIZED) {
    GTEST_SKIP() << "a sanitizer has its own allocator";
  }
  // In a child, which has no other threads: those of the library may end, or release what earlier tests have used.
  EXPECT_EQ(Testing::RunInChild([] {
              const std::size_t before = CountAllocatedBytes();
              auto ours = std::make_unique<std::string>(100'000, 'x');
              void *const openSsl = OPENSSL_malloc(200'000);
              const std::size_t held = CountAllocatedBytes() - before;
              EXPECT_GE(held, 300'000u);
              EXPECT_LT(held, 310'000u);
              ours.reset();
              OPENSSL_free(openSsl);
              EXPECT_EQ(CountAllocatedBytes(), before);
            }),
            "");
}

} // namespace
} // namespace SsoClient
