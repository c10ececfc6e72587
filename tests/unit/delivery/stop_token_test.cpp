// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/client/call_options.h>
#include <ssoclient/client/cancellation.h>

#include "support/rendezvous.h"
#include "support/sanitized.h"

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <stop_token>
#include <thread>
#include <type_traits>
#include <utility>

namespace SsoClient {
namespace {

using Testing::Gate;

static_assert(std::is_convertible_v<std::stop_token, CancelToken>);

TEST(CancelTokenOfAStopToken, IsCancelledByItsStopSource) {
  std::stop_source source;
  CallOptions options;
  options.cancelToken = source.get_token();
  int calls = 0;
  const CancelRegistration registration = options.cancelToken.OnCancel([&calls] { ++calls; });
  EXPECT_TRUE(options.cancelToken.CanBeCancelled());
  EXPECT_FALSE(options.cancelToken.IsCancelled());
  source.request_stop();
  EXPECT_TRUE(options.cancelToken.IsCancelled());
  EXPECT_EQ(calls, 1);
}

TEST(CancelTokenOfAStopToken, IsCancelledFromTheStartWhenTheStopWasRequested) {
  std::stop_source source;
  source.request_stop();
  EXPECT_TRUE(CancelToken(source.get_token()).IsCancelled());
}

TEST(CancelTokenOfAStopToken, CannotBeCancelledWithoutAStopSource) {
  EXPECT_FALSE(CancelToken(std::stop_token()).CanBeCancelled());
  auto source = std::make_unique<std::stop_source>();
  const std::stop_token orphan = source->get_token();
  source.reset();
  EXPECT_FALSE(CancelToken(orphan).CanBeCancelled());
}

TEST(CancelTokenOfAStopToken, IsKeptAliveByARegistration) {
  std::stop_source source;
  int calls = 0;
  const CancelRegistration registration = CancelToken(source.get_token()).OnCancel([&calls] { ++calls; });
  source.request_stop();
  EXPECT_EQ(calls, 1);
}

TEST(CancelTokenOfAStopToken, LeavesNothingWithTheStopSourceWhenItIsReleased) {
  std::stop_source source;
  auto held = std::make_shared<int>(0);
  const std::weak_ptr<int> watched = held;
  {
    const CancelRegistration registration = CancelToken(source.get_token()).OnCancel([held = std::move(held)] {});
    EXPECT_FALSE(watched.expired());
  }
  EXPECT_TRUE(watched.expired());
  source.request_stop();
}

TEST(CancelTokenOfAStopToken, IsReleasedWithoutWaitingForAFunctionThatRuns) {
  std::stop_source source;
  Gate gate;
  CancelToken token = source.get_token();
  std::atomic<bool> hasReturned{false};
  CancelRegistration registration = token.OnCancel([&gate, &hasReturned] {
    gate.Pass();
    hasReturned = true;
  });
  std::thread canceller([&source] { source.request_stop(); });
  EXPECT_TRUE(gate.WaitForArrivals(1));
  registration = {};
  token = {}; // only the thread that cancels shares it now
  EXPECT_FALSE(hasReturned);
  gate.Open();
  canceller.join();
}

TEST(CancelTokenOfAStopToken, IsReleasedByTheFunctionThatItCalls) {
  std::stop_source source;
  auto token = std::make_unique<CancelToken>(source.get_token());
  CancelRegistration registration;
  registration = token->OnCancel([&] {
    token.reset();
    registration = {};
  });
  EXPECT_TRUE(source.request_stop());
  EXPECT_EQ(token, nullptr);
}

TEST(CancelTokenOfAStopToken, IsMadeAndReleasedWhileAnotherThreadRequestsTheStop) {
  for (int round = 0; round < (Testing::IS_SANITIZED ? 200 : 5'000); ++round) {
    std::stop_source source;
    std::thread canceller([&source] { source.request_stop(); });
    bool isCalled = false;
    for (bool isOver = false; !isOver;) {
      isOver = source.stop_requested();
      const auto called = std::make_shared<std::atomic<int>>(0);
      CancelToken token = source.get_token();
      CancelRegistration registration = token.OnCancel([called] { ++*called; });
      registration = {};
      isCalled = *called == 1;
    }
    canceller.join();
    EXPECT_TRUE(isCalled) << "the stop was requested before the last registration";
  }
}

TEST(CancelTokenOfAStopToken, EndsWithTheThreadThatOwnsTheStopSource) {
  bool isCancelled = false;
  {
    const std::jthread thread([&isCancelled](const CancelToken &token) {
      Gate gate; // opened by the destructor of the thread object
      const CancelRegistration registration = token.OnCancel([&gate] { gate.Open(); });
      gate.Pass();
      isCancelled = token.IsCancelled();
    });
  }
  EXPECT_TRUE(isCancelled);
}

} // namespace
} // namespace SsoClient
