// SPDX-License-Identifier: Apache-2.0
// One service, used from sixteen threads at once over TLS.
#include "integration/service_load/canned_service.h"
#include "support/process_resources.h"

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using Testing::CountAllocatedBytes;
using Testing::CountDescriptors;
using TokenPtr = std::shared_ptr<const SamlToken>;

constexpr int THREADS = 16;

/// Sessions, of which the latest are kept, are not all of one size; client and service both live in this process. A leak
/// of 14 bytes in each of 20,000 operations would be more.
constexpr std::size_t MOST_BYTES_OF_GROWTH = 262144;

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 60;
  return spec;
}

/// Runs all operations in turn.
class OperationsInTurn {
public:
  explicit OperationsInTurn(const SecurityTokenServiceConfig &config) : m_service(CreateSecurityTokenService(config)) {}

  void RunOnAllThreads(int count) {
    std::vector<std::thread> threads;
    for (int thread = 0; thread < THREADS; ++thread) {
      threads.emplace_back([this, thread, count] {
        for (int i = thread; i < count; i += THREADS) {
          RunAndJudge(i);
        }
      });
    }
    for (std::thread &thread : threads) {
      thread.join();
    }
  }

  int CountSuccesses() const { return m_successes; }
  /// The first failure; empty for none.
  std::string GetFailure() const {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_failure;
  }

private:
  void RunAndJudge(int i) {
    try {
      if (Run(i)) {
        ++m_successes;
      }
    } catch (const std::exception &exception) {
      const std::lock_guard<std::mutex> lock(m_mutex);
      m_failure = m_failure.empty() ? exception.what() : m_failure;
    }
  }

  bool Run(int i) const {
    switch (i % 5) {
    case 0:
      return IsAlices(m_service->AcquireToken("alice@corp.example", "pass", Spec()));
    case 1:
      return IsAlices(m_service->AcquireTokenByCertificate(Spec()));
    case 2:
      return IsAlices(m_service->AcquireTokenByToken(*m_held, Spec()));
    case 3:
      return m_service->ValidateSubject(*m_held);
    default:
      return IsAlices(m_service->RenewToken(*m_held, 60));
    }
  }

  static bool IsAlices(const TokenPtr &token) {
    return token && token->GetSubject().ToString() == "{Name: alice; Domain:corp.example}";
  }

  const std::shared_ptr<const SecurityTokenService> m_service;
  const TokenPtr m_held = Testing::HeldToken();
  std::atomic<int> m_successes{0};
  mutable std::mutex m_mutex;
  std::string m_failure;
};

TEST(OneServiceOnSixteenThreadsOverTls, RunsTwentyThousandOperationsWithoutErrorOrGrowth) {
  // Under a sanitizer a tenth of them, which takes as long as all do elsewhere.
  constexpr int COUNT = Testing::IS_SANITIZED ? 2000 : 20000;
  constexpr int FIRST = 160; // after which whatever is made once is there
  const Testing::CannedService server;
  const auto allEnded = [&] { return server.CountOpenConnections() == 0; };
  OperationsInTurn operations(server.GetConfig());
  operations.RunOnAllThreads(FIRST);
  ASSERT_EQ(operations.GetFailure(), "");
  ASSERT_TRUE(Testing::Eventually(allEnded));

  const std::size_t bytes = CountAllocatedBytes();
  const std::size_t descriptors = CountDescriptors();
  operations.RunOnAllThreads(COUNT);
  EXPECT_EQ(operations.GetFailure(), "");
  EXPECT_EQ(operations.CountSuccesses(), FIRST + COUNT);
  EXPECT_EQ(server.CountConnections(), FIRST + COUNT);
  ASSERT_TRUE(Testing::Eventually(allEnded));
  EXPECT_TRUE(Testing::Eventually([&] { return CountDescriptors() <= descriptors; })) << CountDescriptors();
  EXPECT_LE(CountAllocatedBytes(), bytes + MOST_BYTES_OF_GROWTH);
}

} // namespace
} // namespace SsoClient
