// SPDX-License-Identifier: Apache-2.0
// Contexts that end before the operations whose handlers they would call. AddressSanitizer finds what leaks, and what
// is used after it is freed.
#include "manual_operation.h"

#include "support/forked.h"
#include "support/rendezvous.h"
#include "support/sanitized.h"

#include <boost/asio/any_io_executor.hpp>
#include <boost/asio/bind_executor.hpp>
#include <boost/asio/executor.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/strand.hpp>
#include <boost/asio/use_future.hpp>

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <system_error>
#include <thread>
#include <utility>

namespace Testing {
namespace {

using boost::asio::bind_executor;
using boost::asio::io_context;

/// A handler, and whether it was called or destroyed.
class WatchedHandler {
public:
  auto Make() {
    return [this, held = std::exchange(m_held, nullptr)](const std::exception_ptr &, bool) { ++m_calls; };
  }

  bool IsDestroyed() const { return m_watched.expired(); }
  int GetCalls() const { return m_calls; }

private:
  std::shared_ptr<int> m_held = std::make_shared<int>(0);
  std::weak_ptr<int> m_watched = m_held;
  int m_calls = 0;
};

TEST(DestroyedContext, DestroysTheHandlerOfAnOperationThatIsUnderWayAndCancelsIt) {
  auto context = std::make_unique<io_context>();
  ManualOperation operation;
  WatchedHandler handler;
  operation.Run(bind_executor(*context, handler.Make()));
  EXPECT_FALSE(handler.IsDestroyed());
  context.reset();
  EXPECT_TRUE(handler.IsDestroyed());
  EXPECT_TRUE(operation.started.cancelToken.IsCancelled());
  operation.End(true);
  EXPECT_EQ(handler.GetCalls(), 0);
}

TEST(DestroyedContext, IsNotUsedThroughAnyExecutorByAnOperationThatEndsLater) {
  const auto check = [](const auto &makeExecutor) {
    auto context = std::make_unique<io_context>();
    ManualOperation operation;
    WatchedHandler handler;
    operation.Run(bind_executor(makeExecutor(*context), handler.Make()));
    context.reset();
    EXPECT_TRUE(handler.IsDestroyed());
    operation.End(true);
    EXPECT_EQ(handler.GetCalls(), 0);
  };
  using boost::asio::any_io_executor;
  using boost::asio::make_strand;
  check([](io_context &context) { return make_strand(context); });
  check([](io_context &context) { return any_io_executor(context.get_executor()); });
  check([](io_context &context) { return any_io_executor(make_strand(context)); });
  check([](io_context &context) { return boost::asio::executor(context.get_executor()); });
}

TEST(DestroyedContext, DestroysTheHandlersOfOperationsThatHaveEnded) {
  auto context = std::make_unique<io_context>();
  ManualOperation operation;
  WatchedHandler handler;
  operation.Run(bind_executor(*context, handler.Make()));
  context->stop();
  operation.End(true);
  EXPECT_EQ(context->run(), 0u) << "it is stopped";
  EXPECT_FALSE(handler.IsDestroyed());
  context.reset();
  EXPECT_TRUE(handler.IsDestroyed());
  EXPECT_EQ(handler.GetCalls(), 0);
  EXPECT_FALSE(operation.started.cancelToken.IsCancelled());
}

TEST(DestroyedContext, BreaksThePromiseOfAFuture) {
  auto context = std::make_unique<io_context>();
  ManualOperation operation;
  std::future<bool> future = operation.Run(bind_executor(*context, boost::asio::use_future));
  context.reset();
  try {
    future.get();
    ADD_FAILURE() << "no exception";
  } catch (const std::future_error &error) {
    EXPECT_EQ(error.code(), std::make_error_code(std::future_errc::broken_promise));
  }
}

TEST(DestroyedContext, MayEndAtTheSameTimeAsTheOperation) {
  for (int round = 0; round < (IS_SANITIZED ? 500 : 5'000); ++round) {
    auto context = std::make_unique<io_context>();
    ManualOperation operation;
    WatchedHandler handler;
    operation.Run(bind_executor(boost::asio::make_strand(*context), handler.Make()));
    std::thread ending([&operation] { operation.End(true); });
    context.reset();
    ending.join();
    EXPECT_TRUE(handler.IsDestroyed());
    EXPECT_EQ(handler.GetCalls(), 0);
  }
}

TEST(ContextInAChildOfFork, DoesNotWaitForTheOperationsOfTheParent) {
  io_context context;
  ManualOperation operation;
  WatchedHandler handler;
  operation.Run(bind_executor(context, handler.Make()));
  EXPECT_EQ(RunInChild([&] {
              context.notify_fork(io_context::fork_child);
              EXPECT_TRUE(handler.IsDestroyed());
              EXPECT_EQ(context.run(), 0u);
              ManualOperation own;
              HandlerCalls calls;
              own.Run(bind_executor(context, calls.MakeHandler()));
              own.End(true);
              context.restart();
              EXPECT_EQ(context.run(), 1u);
              EXPECT_EQ(calls.count, 1);
            }),
            "");
  context.notify_fork(io_context::fork_parent);
  operation.End(true);
  EXPECT_EQ(context.run(), 1u);
  EXPECT_EQ(handler.GetCalls(), 1);
}

} // namespace
} // namespace Testing
