// SPDX-License-Identifier: Apache-2.0
// Coroutines of Asio.
#include "manual_operation.h"

#include "support/throws_message.h"

#include <ssoclient/exceptions.h>

#include <boost/asio/co_spawn.hpp>
#include <boost/asio/detached.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/use_awaitable.hpp>

#include <gtest/gtest.h>

#include <exception>
#include <memory>
#include <thread>
#include <utility>

#ifdef BOOST_ASIO_HAS_CO_AWAIT

#ifdef SSOCLIENT_ASIO_HAS_CANCELLATION_SLOTS
#include <boost/asio/bind_cancellation_slot.hpp>
#include <boost/asio/cancellation_signal.hpp>
#include <boost/asio/experimental/awaitable_operators.hpp>
#endif

namespace Testing {
namespace {

using boost::asio::awaitable;
using boost::asio::co_spawn;
using boost::asio::detached;
using boost::asio::io_context;
using boost::asio::use_awaitable;
using SsoClient::InvalidCredentialsException;

awaitable<void> Wait(ManualOperation &operation, bool &result) {
  result = co_await operation.Run(use_awaitable);
}

TEST(CoroutineOfAsio, GetsTheResultOnItsExecutor) {
  io_context context;
  ManualOperation operation;
  bool result = false;
  std::thread::id seen;
  co_spawn(
      context,
      [&]() -> awaitable<void> {
        result = co_await operation.Run(use_awaitable);
        seen = std::this_thread::get_id();
      },
      detached);
  context.poll();
  ASSERT_TRUE(operation.IsUnderWay());
  std::thread ending([&operation] { operation.End(true); });
  context.run();
  ending.join();
  EXPECT_TRUE(result);
  EXPECT_EQ(seen, std::this_thread::get_id());
}

TEST(CoroutineOfAsio, GetsAFailureInItsOwnClass) {
  io_context context;
  ManualOperation operation;
  std::exception_ptr failure;
  bool result = false;
  co_spawn(context, Wait(operation, result), [&failure](const std::exception_ptr &thrown) { failure = thrown; });
  context.poll();
  operation.End(std::make_exception_ptr(InvalidCredentialsException("wrong password")));
  context.run();
  ASSERT_NE(failure, nullptr);
  EXPECT_THROWS_MESSAGE(std::rethrow_exception(failure), InvalidCredentialsException, "wrong password");
}

TEST(CoroutineOfAsio, GetsWhatTheStartOfTheOperationThrows) {
  io_context context;
  ManualOperation operation;
  operation.onStart = [] { throw InvalidCredentialsException("no thread"); };
  std::exception_ptr failure;
  bool result = false;
  co_spawn(context, Wait(operation, result), [&failure](const std::exception_ptr &thrown) { failure = thrown; });
  context.run();
  ASSERT_NE(failure, nullptr);
  EXPECT_THROWS_MESSAGE(std::rethrow_exception(failure), InvalidCredentialsException, "no thread");
}

TEST(CoroutineOfAsio, IsDestroyedWithItsContext) {
  auto context = std::make_unique<io_context>();
  ManualOperation operation;
  auto held = std::make_shared<int>(0);
  const std::weak_ptr<int> watched = held;
  co_spawn(
      *context,
      [](ManualOperation &waited, std::shared_ptr<int>) -> awaitable<void> {
        co_await waited.Run(use_awaitable);
        ADD_FAILURE() << "continued";
      }(operation, std::move(held)),
      detached);
  context->poll();
  ASSERT_TRUE(operation.IsUnderWay());
  context.reset();
  EXPECT_TRUE(watched.expired());
  EXPECT_TRUE(operation.started.cancelToken.IsCancelled());
  operation.End(true);
}

#ifdef SSOCLIENT_ASIO_HAS_CANCELLATION_SLOTS
TEST(CoroutineOfAsio, CancelsItsOperationWhenItIsCancelled) {
  io_context context;
  ManualOperation operation;
  boost::asio::cancellation_signal signal;
  bool result = false;
  co_spawn(context, Wait(operation, result), boost::asio::bind_cancellation_slot(signal.slot(), detached));
  context.poll();
  ASSERT_TRUE(operation.IsUnderWay());
  EXPECT_FALSE(operation.started.cancelToken.IsCancelled());
  signal.emit(boost::asio::cancellation_type::terminal);
  context.poll(); // the signal is passed to the coroutine on its executor
  EXPECT_TRUE(operation.started.cancelToken.IsCancelled());
  operation.End(true);
  context.run();
  EXPECT_TRUE(result) << "the operation had a result all the same";
}

TEST(CoroutineOfAsio, CancelsTheSlowerOfTwoOperations) {
  using boost::asio::experimental::awaitable_operators::operator||;
  io_context context;
  ManualOperation fast;
  ManualOperation slow;
  std::size_t first = 9;
  co_spawn(
      context,
      [&]() -> awaitable<void> {
        const auto result = co_await (fast.Run(use_awaitable) || slow.Run(use_awaitable));
        first = result.index();
      },
      detached);
  context.poll();
  ASSERT_TRUE(fast.IsUnderWay() && slow.IsUnderWay());
  fast.End(true);
  context.poll();
  EXPECT_FALSE(fast.started.cancelToken.IsCancelled());
  EXPECT_TRUE(slow.started.cancelToken.IsCancelled());
  slow.End(std::make_exception_ptr(InvalidCredentialsException("cancelled")));
  context.run();
  EXPECT_EQ(first, 0u);
}
#endif

} // namespace
} // namespace Testing

#endif
