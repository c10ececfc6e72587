// SPDX-License-Identifier: Apache-2.0
// What a completion may do when completions occupy every thread of the pool.
#include "integration/service_load/canned_service.h"
#include "support/rendezvous.h"

#include <ssoclient/security_token_service.h>
#include <tarvel/system/thread_pool.h>

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>

namespace SsoClient {
namespace {

using TokenPtr = std::shared_ptr<const SamlToken>;

constexpr int THREADS = Tarvel::System::DEFAULT_THREAD_CEILING;

TEST(CompletionsOnAllThreadsOfThePool, CallSynchronousOperationsAndStartAsynchronousOnes) {
  struct Shared {
    Testing::EventCount inCompletion;
    Testing::EventCount inSecondCompletion;
    std::atomic<int> tokens{0};
  };
  const auto shared = std::make_shared<Shared>();
  const Testing::CannedService server;
  const SecurityTokenServiceConfig config = server.GetConfig();
  const std::shared_ptr<const SecurityTokenService> service = CreateSecurityTokenService(config);
  TokenSpec spec;
  spec.tokenLifetimeSec = 60;
  const auto count = [shared](const TokenPtr &token, const Tarvel::Exception *) {
    shared->tokens += token != nullptr;
    shared->inSecondCompletion.Add();
  };
  const auto goOn = [shared, service, spec, count](const TokenPtr &token, const Tarvel::Exception *) {
    shared->tokens += token != nullptr;
    shared->inCompletion.Add();
    shared->inCompletion.WaitFor(THREADS);
    shared->tokens += service->AcquireToken("alice@corp.example", "pass", spec) != nullptr;
    service->AcquireTokenAsync("alice@corp.example", "pass", spec, count);
  };
  for (int i = 0; i < THREADS; ++i) {
    service->AcquireTokenAsync("alice@corp.example", "pass", spec, goOn);
  }
  EXPECT_TRUE(shared->inSecondCompletion.WaitFor(THREADS));
  EXPECT_EQ(shared->tokens, 3 * THREADS);
}

} // namespace
} // namespace SsoClient
