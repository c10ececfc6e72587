// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/client/awaitable.h>

#ifdef SSOCLIENT_HAS_COROUTINES

#include "support/coroutine_types.h"
#include "support/rendezvous.h"
#include "support/sanitized.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <atomic>
#include <exception>
#include <functional>
#include <memory>
#include <new>
#include <optional>
#include <stdexcept>
#include <string>
#include <thread>
#include <type_traits>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using Testing::EagerTask;
using Testing::EventCount;
using Testing::LazyTask;

static_assert(!std::is_copy_constructible_v<Awaitable<bool>> && !std::is_move_assignable_v<Awaitable<bool>>);

/// An operation that ends when the test calls `End`.
class Operation {
public:
  Awaitable<bool> Run() {
    return Awaitable<bool>([this](const CancelToken &token, Awaitable<bool>::Callback callback) {
      ++starts;
      cancelToken = token;
      m_callback = std::move(callback);
    });
  }

  void End(const Outcome<bool> &outcome) { std::exchange(m_callback, nullptr)(outcome); }
  /// Returns the callback, which the engine calls once even if the operation was cancelled.
  Awaitable<bool>::Callback TakeCallback() { return std::exchange(m_callback, nullptr); }

  int starts = 0;
  CancelToken cancelToken;

private:
  Awaitable<bool>::Callback m_callback;
};

std::exception_ptr Failure(const std::string &text) {
  return std::make_exception_ptr(InvalidCredentialsException(text));
}

EagerTask Wait(Awaitable<bool> awaitable, std::vector<std::string> &results) {
  try {
    results.push_back(co_await awaitable ? "true" : "false");
  } catch (const std::exception &failure) {
    results.push_back(failure.what());
  }
}

TEST(Awaitable, StartsItsOperationWhenItIsAwaited) {
  Operation operation;
  std::vector<std::string> results;
  Awaitable<bool> awaitable = operation.Run();
  EXPECT_EQ(operation.starts, 0);
  const EagerTask task = Wait(std::move(awaitable), results);
  EXPECT_EQ(operation.starts, 1);
  EXPECT_FALSE(task.IsDone());
  operation.End(true);
  EXPECT_TRUE(task.IsDone());
  EXPECT_EQ(results, std::vector<std::string>{"true"});
  EXPECT_FALSE(operation.cancelToken.IsCancelled());
}

TEST(Awaitable, CancelsNothingIfItIsNotAwaited) {
  Operation operation;
  { const Awaitable<bool> dropped = operation.Run(); }
  EXPECT_EQ(operation.starts, 0);
}

EagerTask ExpectFailure(Operation &operation) {
  try {
    co_await operation.Run();
    ADD_FAILURE() << "no exception";
  } catch (...) {
    EXPECT_THROWS_MESSAGE(throw, InvalidCredentialsException, "wrong password");
  }
}

TEST(Awaitable, ThrowsAFailureInItsOwnClass) {
  Operation operation;
  const EagerTask task = ExpectFailure(operation);
  operation.End(Failure("wrong password"));
  EXPECT_TRUE(task.IsDone());
}

TEST(Awaitable, ContinuesTheCoroutineOnTheThreadOfTheCallback) {
  Operation operation;
  std::thread::id seen;
  const EagerTask task = [](Operation &waited, std::thread::id &id) -> EagerTask {
    co_await waited.Run();
    id = std::this_thread::get_id();
  }(operation, seen);
  std::thread thread([&operation] { operation.End(true); });
  const std::thread::id ending = thread.get_id();
  thread.join();
  EXPECT_TRUE(task.IsDone());
  EXPECT_EQ(seen, ending);
}

TEST(Awaitable, CancelsTheOperationWhenTheCoroutineThatWaitsIsDestroyed) {
  Operation operation;
  std::vector<std::string> results;
  {
    const EagerTask task = Wait(operation.Run(), results);
    EXPECT_FALSE(operation.cancelToken.IsCancelled());
  }
  EXPECT_TRUE(operation.cancelToken.IsCancelled());
  operation.End(true); // never continues the coroutine
  EXPECT_EQ(results, std::vector<std::string>());
}

TEST(Awaitable, CanBeDestroyedIfTheCancelEndsItsOperationAtOnce) {
  Operation operation;
  CancelRegistration registration;
  std::vector<std::string> results;
  {
    const EagerTask task = Wait(operation.Run(), results);
    registration = operation.cancelToken.OnCancel([&operation] { operation.End(Failure("cancelled")); });
  }
  EXPECT_EQ(results, std::vector<std::string>());
}

EagerTask WaitTwice(Operation &operation, std::vector<std::string> &results) {
  Awaitable<bool> awaitable = operation.Run();
  results.push_back(co_await awaitable ? "true" : "false");
  try {
    co_await awaitable;
    ADD_FAILURE() << "awaited twice";
  } catch (...) {
    EXPECT_THROWS_MESSAGE(throw, Tarvel::InvalidStateException, "This operation has already been awaited");
    results.push_back("refused");
  }
}

TEST(Awaitable, IsAwaitedOnlyOnce) {
  Operation operation;
  std::vector<std::string> results;
  const EagerTask task = WaitTwice(operation, results);
  operation.End(true);
  EXPECT_TRUE(task.IsDone());
  EXPECT_EQ(results, (std::vector<std::string>{"true", "refused"}));
  EXPECT_EQ(operation.starts, 1);
}

TEST(Awaitable, CannotBeAwaitedWhenItWasMovedFrom) {
  Operation operation;
  Awaitable<bool> awaitable = operation.Run();
  const Awaitable<bool> moved = std::move(awaitable);
  std::vector<std::string> results;
  const EagerTask task = Wait(std::move(awaitable), results); // NOLINT(bugprone-use-after-move)
  EXPECT_EQ(results, std::vector<std::string>{"This operation has already been awaited"});
}

TEST(Awaitable, ThrowsWhatTheStartOfTheOperationThrows) {
  std::vector<std::string> results;
  const EagerTask task = Wait(
      Awaitable<bool>([](const CancelToken &, const Awaitable<bool>::Callback &) { throw std::bad_alloc(); }), results);
  EXPECT_TRUE(task.IsDone());
  EXPECT_EQ(results, std::vector<std::string>{"std::bad_alloc"});
}

TEST(Awaitable, FreesTheStartWhenTheOperationIsStartedAndTheCallbackWhenItHasEnded) {
  auto held = std::make_shared<int>(0);
  const std::weak_ptr<int> watched = held;
  Awaitable<bool>::Callback callback;
  std::vector<std::string> results;
  const EagerTask task =
      Wait(Awaitable<bool>([held = std::move(held), &callback](const CancelToken &, Awaitable<bool>::Callback given) {
             callback = std::move(given);
           }),
           results);
  EXPECT_TRUE(watched.expired()) << "the start may own a password";
  callback(true);
  callback = nullptr;
  EXPECT_EQ(results, std::vector<std::string>{"true"});
}

Awaitable<bool> EndingAtOnce() {
  return Awaitable<bool>([](const CancelToken &, const Awaitable<bool>::Callback &callback) { callback(true); });
}

EagerTask WaitOften(int count, int &successes) {
  for (int i = 0; i < count; ++i) {
    successes += co_await EndingAtOnce() ? 1 : 0;
  }
}

TEST(Awaitable, NeedsNoStackForOperationsThatEndAtOnce) {
  constexpr int COUNT = Testing::IS_SANITIZED ? 100'000 : 1'000'000;
  int successes = 0;
  const EagerTask task = WaitOften(COUNT, successes);
  EXPECT_TRUE(task.IsDone());
  EXPECT_EQ(successes, COUNT);
}

LazyTask<std::string> Describe(Operation &operation) {
  co_return co_await operation.Run() ? "valid" : "invalid";
}

EagerTask WaitForDescription(Operation &operation, std::string &description) {
  description = co_await Describe(operation);
}

TEST(Awaitable, IsAwaitedInCoroutinesOfOtherTypes) {
  Operation operation;
  std::string description;
  const EagerTask task = WaitForDescription(operation, description);
  EXPECT_EQ(operation.starts, 1);
  operation.End(false);
  EXPECT_EQ(description, "invalid");
}

TEST(Awaitable, CancelsTheOperationOfAnInnerCoroutine) {
  Operation operation;
  std::string description;
  { const EagerTask task = WaitForDescription(operation, description); }
  EXPECT_TRUE(operation.cancelToken.IsCancelled());
  operation.End(true);
  EXPECT_EQ(description, "");
}

/// Waits for operations that end on another thread, sometimes before the start has returned.
EagerTask WaitForOtherThread(int count, std::function<void(std::function<void()>)> execute, int &successes,
                             EventCount &done) {
  for (int i = 0; i < count; ++i) {
    const bool isValid = co_await Awaitable<bool>([&](const CancelToken &, const Awaitable<bool>::Callback &callback) {
      execute([callback] { callback(true); });
    });
    successes += isValid ? 1 : 0;
  }
  done.Add();
}

TEST(Awaitable, ContinuesOnceEvenIfTheOperationEndsBeforeItsStartReturns) {
  constexpr int COUNT = Testing::IS_SANITIZED ? 2'000 : 20'000;
  std::vector<std::function<void()>> queue;
  std::mutex mutex;
  EventCount done;
  int successes = 0;
  std::atomic<bool> isOver{false};
  const auto execute = [&](std::function<void()> function) {
    const std::lock_guard<std::mutex> lock(mutex);
    queue.push_back(std::move(function));
  };
  std::vector<std::thread> threads;
  for (int i = 0; i < 2; ++i) {
    threads.emplace_back([&] {
      while (!isOver) {
        std::vector<std::function<void()>> taken;
        {
          const std::lock_guard<std::mutex> lock(mutex);
          taken.swap(queue);
        }
        for (const std::function<void()> &function : taken) {
          function();
        }
        std::this_thread::yield();
      }
    });
  }
  const EagerTask task = WaitForOtherThread(COUNT, execute, successes, done);
  EXPECT_TRUE(done.WaitFor(1));
  isOver = true;
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(successes, COUNT);
}

} // namespace
} // namespace SsoClient

#endif
