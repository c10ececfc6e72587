// SPDX-License-Identifier: Apache-2.0
/// @file
/// Two types of coroutines that programs commonly have: one that starts at once, and one that starts when it is
/// awaited.

#pragma once

#include <ssoclient/client/awaitable.h>

#ifdef SSOCLIENT_HAS_COROUTINES

#include <coroutine>
#include <exception>
#include <future>
#include <memory>
#include <optional>
#include <utility>

namespace Testing {

/// Starts at once, and is destroyed with this object, whether or not it has ended. If it ends on another thread, call
/// `WaitUntilDone` first. An exception in it ends the process.
class EagerTask {
public:
  struct promise_type { // NOLINT(readability-identifier-naming): the language names it
    /// Reports the end after the coroutine has been suspended for good. From then on it may be destroyed.
    struct FinalAwaiter {
      bool await_ready() const noexcept { return false; }
      void await_suspend(std::coroutine_handle<promise_type> handle) const noexcept {
        const std::shared_ptr<std::promise<void>> end = handle.promise().ended; // outlives the coroutine
        end->set_value();
      }
      void await_resume() const noexcept {}
    };

    EagerTask get_return_object() { return EagerTask(std::coroutine_handle<promise_type>::from_promise(*this)); }
    std::suspend_never initial_suspend() const noexcept { return {}; }
    FinalAwaiter final_suspend() const noexcept { return {}; }
    void return_void() const noexcept {}
    void unhandled_exception() const noexcept { std::terminate(); }

    const std::shared_ptr<std::promise<void>> ended = std::make_shared<std::promise<void>>();
  };

  EagerTask(EagerTask &&other) noexcept : m_handle(std::exchange(other.m_handle, nullptr)) {}
  EagerTask &operator=(EagerTask &&) = delete;
  ~EagerTask() {
    if (m_handle) {
      m_handle.destroy();
    }
  }

  bool IsDone() const { return m_handle.done(); }

  /// Waits until the coroutine has ended. May be called once.
  void WaitUntilDone() const { m_handle.promise().ended->get_future().wait(); }

private:
  explicit EagerTask(std::coroutine_handle<promise_type> handle) : m_handle(handle) {}

  std::coroutine_handle<promise_type> m_handle;
};

/// Starts when it is awaited, and continues the coroutine that awaits it.
template <typename Value>
class LazyTask {
public:
  struct promise_type { // NOLINT(readability-identifier-naming): the language names it
    struct FinalAwaiter {
      bool await_ready() const noexcept { return false; }
      std::coroutine_handle<> await_suspend(std::coroutine_handle<promise_type> handle) const noexcept {
        return handle.promise().waiting;
      }
      void await_resume() const noexcept {}
    };

    LazyTask get_return_object() { return LazyTask(std::coroutine_handle<promise_type>::from_promise(*this)); }
    std::suspend_always initial_suspend() const noexcept { return {}; }
    FinalAwaiter final_suspend() const noexcept { return {}; }
    void return_value(Value result) { value = std::move(result); }
    void unhandled_exception() noexcept { exception = std::current_exception(); }

    std::coroutine_handle<> waiting;
    std::optional<Value> value;
    std::exception_ptr exception;
  };

  LazyTask(LazyTask &&other) noexcept : m_handle(std::exchange(other.m_handle, nullptr)) {}
  LazyTask &operator=(LazyTask &&) = delete;
  ~LazyTask() {
    if (m_handle) {
      m_handle.destroy();
    }
  }

  bool await_ready() const noexcept { return false; }
  std::coroutine_handle<> await_suspend(std::coroutine_handle<> waiting) noexcept {
    m_handle.promise().waiting = waiting;
    return m_handle;
  }
  Value await_resume() {
    if (m_handle.promise().exception) {
      std::rethrow_exception(std::exchange(m_handle.promise().exception, nullptr));
    }
    return *std::move(m_handle.promise().value);
  }

private:
  explicit LazyTask(std::coroutine_handle<promise_type> handle) : m_handle(handle) {}

  std::coroutine_handle<promise_type> m_handle;
};

} // namespace Testing

#endif
