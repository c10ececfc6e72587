// SPDX-License-Identifier: Apache-2.0
// Handlers: where, when and how often they are called.
#include "manual_operation.h"

#include "support/throws_message.h"

#include <ssoclient/exceptions.h>

#include <boost/asio/any_io_executor.hpp>
#include <boost/asio/bind_executor.hpp>
#include <boost/asio/executor.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/strand.hpp>
#include <boost/asio/thread_pool.hpp>
#include <boost/asio/use_future.hpp>

#include <gtest/gtest.h>

#include <cstddef>
#include <future>
#include <memory>
#include <new>
#include <stdexcept>
#include <thread>
#include <utility>

namespace Testing {
namespace {

using boost::asio::bind_executor;
using boost::asio::io_context;
using SsoClient::CallOptions;
using SsoClient::InvalidCredentialsException;

std::exception_ptr WrongPassword() {
  return std::make_exception_ptr(InvalidCredentialsException("wrong password"));
}

TEST(Handler, IsCalledOnItsExecutorWithTheResult) {
  io_context context;
  ManualOperation operation;
  HandlerCalls calls;
  operation.Run(bind_executor(context, calls.MakeHandler()));
  operation.End(true);
  EXPECT_EQ(calls.count, 0);
  EXPECT_EQ(context.run(), 1u);
  EXPECT_EQ(calls.count, 1);
  EXPECT_TRUE(calls.value);
  EXPECT_EQ(calls.failure, nullptr);
}

TEST(Handler, GetsAFailureInItsOwnClass) {
  io_context context;
  ManualOperation operation;
  HandlerCalls calls;
  operation.Run(bind_executor(context, calls.MakeHandler()));
  operation.End(WrongPassword());
  context.run();
  EXPECT_FALSE(calls.value);
  ASSERT_NE(calls.failure, nullptr);
  EXPECT_THROWS_MESSAGE(std::rethrow_exception(calls.failure), InvalidCredentialsException, "wrong password");
}

TEST(Handler, KeepsItsContextRunningUntilItIsCalled) {
  io_context context;
  ManualOperation operation;
  HandlerCalls calls;
  operation.Run(bind_executor(context, calls.MakeHandler()));
  context.poll();
  EXPECT_FALSE(context.stopped()) << "the operation is under way";
  std::thread ending([&operation] { operation.End(true); });
  context.run();
  EXPECT_EQ(calls.count, 1);
  EXPECT_TRUE(context.stopped());
  ending.join();
}

TEST(Handler, IsNotCalledWithinTheStartOfTheOperation) {
  io_context context;
  ManualOperation operation;
  operation.onStart = [&operation] { operation.End(true); };
  HandlerCalls calls;
  boost::asio::post(context, [&] {
    operation.Run(bind_executor(context, calls.MakeHandler()));
    EXPECT_EQ(calls.count, 0);
  });
  context.run();
  EXPECT_EQ(calls.count, 1);
}

TEST(Handler, IsCalledByTheThreadThatEndsTheOperationIfItHasNoExecutor) {
  ManualOperation operation;
  std::thread::id called;
  operation.Run([&called](const std::exception_ptr &, bool) { called = std::this_thread::get_id(); });
  std::thread ending([&operation] { operation.End(true); });
  const std::thread::id expected = ending.get_id();
  ending.join();
  EXPECT_EQ(called, expected);
}

TEST(Handler, StartsTheNextOperation) {
  ManualOperation first;
  ManualOperation second;
  HandlerCalls calls;
  first.Run([&](const std::exception_ptr &, bool) { second.Run(calls.MakeHandler()); });
  first.End(true);
  second.End(true);
  EXPECT_EQ(calls.count, 1);
}

TEST(Handler, GetsWhatTheStartOfTheOperationThrows) {
  io_context context;
  ManualOperation operation;
  operation.onStart = [] { throw std::bad_alloc(); };
  HandlerCalls calls;
  operation.Run(bind_executor(context, calls.MakeHandler()));
  EXPECT_EQ(calls.count, 0);
  context.run();
  EXPECT_EQ(calls.count, 1);
  EXPECT_THROW(std::rethrow_exception(calls.failure), std::bad_alloc);
}

TEST(Handler, MayBeMoveOnly) {
  io_context context;
  ManualOperation operation;
  int value = 0;
  operation.Run(bind_executor(
      context, [held = std::make_unique<int>(7), &value](const std::exception_ptr &, bool) { value = *held; }));
  operation.End(true);
  context.run();
  EXPECT_EQ(value, 7);
}

TEST(Handler, IsCalledOnExecutorsOfAllKinds) {
  io_context context;
  ManualOperation operation;
  HandlerCalls calls;
  const auto check = [&](const auto &executor) {
    operation.Run(bind_executor(executor, calls.MakeHandler()));
    operation.End(true);
    context.restart();
    EXPECT_EQ(context.run(), 1u);
  };
  check(boost::asio::make_strand(context));
  check(boost::asio::any_io_executor(context.get_executor()));
  check(boost::asio::any_io_executor(boost::asio::make_strand(context)));
  check(boost::asio::executor(context.get_executor()));
  EXPECT_EQ(calls.count, 4);
}

TEST(Handler, IsCalledOnAThreadPool) {
  ManualOperation operation;
  HandlerCalls calls;
  boost::asio::thread_pool pool(1);
  operation.Run(bind_executor(pool, calls.MakeHandler()));
  operation.End(true);
  pool.join();
  EXPECT_EQ(calls.count, 1);
}

/// Counts what it has allocated and not freed.
template <typename T>
struct CountingAllocator {
  using value_type = T; // NOLINT(readability-identifier-naming)

  explicit CountingAllocator(int *liveCount, int *allCount) : live(liveCount), all(allCount) {}
  template <typename Other>
  CountingAllocator(const CountingAllocator<Other> &other) : live(other.live), all(other.all) {}

  T *allocate(std::size_t count) { // NOLINT(readability-identifier-naming)
    ++*live;
    ++*all;
    return std::allocator<T>().allocate(count);
  }
  void deallocate(T *memory, std::size_t count) { // NOLINT(readability-identifier-naming)
    --*live;
    std::allocator<T>().deallocate(memory, count);
  }
  template <typename Other>
  bool operator==(const CountingAllocator<Other> &other) const {
    return live == other.live;
  }
  template <typename Other>
  bool operator!=(const CountingAllocator<Other> &other) const {
    return live != other.live;
  }

  int *live;
  int *all;
};

/// A handler with an allocator. When it is called, all memory of the allocator must be freed.
struct AllocatingHandler {
  using allocator_type = CountingAllocator<char>; // NOLINT(readability-identifier-naming)

  allocator_type get_allocator() const { return allocator; } // NOLINT(readability-identifier-naming)
  void operator()(const std::exception_ptr &, bool) const { *liveDuringCall = *allocator.live; }

  allocator_type allocator;
  int *liveDuringCall;
};

TEST(Handler, PassesItsAllocatorToItsExecutorAndAllMemoryIsFreedBeforeTheCall) {
  io_context context;
  ManualOperation operation;
  int live = 0;
  int all = 0;
  int liveDuringCall = -1;
  operation.Run(bind_executor(context, AllocatingHandler{CountingAllocator<char>(&live, &all), &liveDuringCall}));
  operation.End(true);
  EXPECT_GT(all, 0);
  context.run();
  EXPECT_EQ(liveDuringCall, 0);
  EXPECT_EQ(live, 0);
}

TEST(UseFuture, ReturnsTheResult) {
  ManualOperation operation;
  std::future<bool> future = operation.Run(boost::asio::use_future);
  operation.End(true);
  EXPECT_TRUE(future.get());
}

TEST(UseFuture, ThrowsAFailureInItsOwnClass) {
  ManualOperation operation;
  std::future<bool> future = operation.Run(boost::asio::use_future);
  operation.End(WrongPassword());
  EXPECT_THROWS_MESSAGE(future.get(), InvalidCredentialsException, "wrong password");
}

} // namespace
} // namespace Testing
