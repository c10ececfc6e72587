// SPDX-License-Identifier: Apache-2.0
#include "exchange/request_builder_impl.h"
#include "exchange/response_handler_impl.h"
#include "support/counting_token.h"
#include "support/identity.h"
#include "support/service_stand_ins.h"
#include "support/soap_responses.h"

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

constexpr int THREADS = 16;

/// Runs `operation` that often in all, on 16 threads that begin together. Returns how many threw.
int RunOnManyThreads(int count, const std::function<void(int)> &operation) {
  std::atomic<int> ready{0};
  std::atomic<int> failures{0};
  std::vector<std::thread> threads;
  for (int thread = 0; thread < THREADS; ++thread) {
    threads.emplace_back([&, thread] {
      for (++ready; ready < THREADS;) {
        std::this_thread::yield();
      }
      for (int i = thread; i < count; i += THREADS) {
        try {
          operation(i);
        } catch (...) {
          ++failures;
        }
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  return failures;
}

TEST(OneServiceOnSixteenThreads, RunsTwentyThousandOperationsWithoutErrorOrLeak) {
  constexpr int OPERATIONS = 20000;
  const auto transport = std::make_shared<Testing::TransportStandIn>([](const Request &request) {
    const auto is = [&](const char *call) { return request.body.rfind(call, 0) == 0; };
    return is("ValidateSubject") ? "valid:true" : is("Renew") ? "renewed:" : "issued:";
  });
  const auto service = Testing::ServiceOn(transport);
  Testing::CountingToken token;
  std::atomic<int> wrong{0};
  const auto expect = [&](bool condition) { wrong += condition ? 0 : 1; };
  const TokenSpec spec = Testing::SpecFor(60);

  const int failures = RunOnManyThreads(OPERATIONS, [&](int i) {
    switch (i % 5) {
    case 0:
      return expect(service->AcquireToken("alice", "pass", spec) == nullptr);
    case 1:
      return expect(service->AcquireTokenByCertificate(spec) == nullptr);
    case 2:
      return expect(service->AcquireTokenByToken(token, spec) == nullptr);
    case 3:
      return expect(service->ValidateSubject(token));
    default:
      return expect(service->RenewToken(token, 60) == nullptr);
    }
  });

  EXPECT_EQ(failures, 0);
  EXPECT_EQ(wrong, 0);
  EXPECT_EQ(transport->CountSessions(), OPERATIONS);
  EXPECT_EQ(transport->CountOpenSessions(), 0);
  EXPECT_EQ(transport.use_count(), 2); // the test's and the service's
}

TEST(OneServiceOnSixteenThreads, ComposesReadsAndVerifiesAllAtOnce) {
  constexpr int OPERATIONS = 320;
  const std::string response = Testing::IssueResponse(Testing::ReadDataFile("tokens/bearer.xml"));
  const auto transport = std::make_shared<Testing::TransportStandIn>([&](const Request &) { return response; });
  const SecurityTokenServiceImpl service(std::make_shared<const RequestBuilderImpl>(Testing::HolderIdentity()),
                                         transport, std::make_shared<const ResponseHandlerImpl>(),
                                         Testing::TrustedCertificates());
  std::atomic<int> tokens{0};
  const int failures = RunOnManyThreads(OPERATIONS, [&](int i) {
    const TokenSpec spec = Testing::SpecFor(60);
    const auto token =
        i % 2 ? service.AcquireTokenByCertificate(spec) : service.AcquireToken("alice@corp.example", "pass", spec);
    tokens += token && token->GetSubject().name == "alice" ? 1 : 0;
  });
  EXPECT_EQ(failures, 0);
  EXPECT_EQ(tokens, OPERATIONS);
}

} // namespace
} // namespace SsoClient
