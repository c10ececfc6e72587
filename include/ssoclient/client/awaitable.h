// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Awaitable`, an operation that a coroutine waits for. Defined where the compiler has the coroutines of C++20.

#pragma once

#include <ssoclient/client/cancellation.h>
#include <ssoclient/client/outcome.h>

#if defined(__cpp_impl_coroutine) && __has_include(<coroutine>)
#define SSOCLIENT_HAS_COROUTINES 1
#include <coroutine>
#endif

#ifdef SSOCLIENT_HAS_COROUTINES

#include <tarvel/core/exception.h>

#include <boost/optional.hpp>

#include <atomic>
#include <functional>
#include <memory>
#include <thread>
#include <type_traits>
#include <utility>

namespace SsoClient {

/// The parts of `Awaitable` that its callback shares. Not for callers.
namespace AwaitDetails {

/// An operation, the coroutine that waits for it, and the outcome.
template <typename Value>
class AwaitState {
public:
  static_assert(std::is_nothrow_copy_constructible_v<Value>,
                "a copy that throws would be an operation without outcome");
  using Start = std::function<void(const CancelToken &, std::function<void(const Outcome<Value> &)>)>;

  explicit AwaitState(Start start) : m_start(std::move(start)) {}

  bool IsStarted() const noexcept { return !m_start; }

  /// Starts the operation. As soon as the operation is started, the coroutine may continue on another thread and be
  /// destroyed. So the caller keeps a reference to `state` until this function returns.
  /// @return whether the coroutine stays suspended. It does not stay suspended when the operation has ended within this
  ///         call. If it were resumed here, a coroutine that awaits in a loop would need more of the stack each time.
  static bool StartFor(std::coroutine_handle<> waiting, const std::shared_ptr<AwaitState> &state) {
    state->m_waiting = waiting;
    state->m_startingThread = std::this_thread::get_id();
    std::exchange(state->m_start, nullptr)(state->m_cancel.GetToken(),
                                           [state](const Outcome<Value> &outcome) { state->End(outcome); });
    state->m_startingThread = std::thread::id();
    return !state->m_hasEndedInStart;
  }

  /// The coroutine is being destroyed. If it waits, it does not continue, and the operation is cancelled.
  void Abandon() noexcept {
    if (!m_isOver.exchange(true)) {
      m_cancel.Cancel();
    }
  }

  const Value &GetResult() const { return m_outcome->Get(); }

private:
  void End(const Outcome<Value> &outcome) {
    if (m_isOver.exchange(true)) {
      return;
    }
    m_outcome = outcome;
    if (m_startingThread.load() == std::this_thread::get_id()) {
      m_hasEndedInStart = true;
      return;
    }
    m_waiting.resume();
  }

  Start m_start; // empty when the operation was started
  CancelSource m_cancel;
  std::coroutine_handle<> m_waiting;
  std::atomic<std::thread::id> m_startingThread{std::thread::id()};
  bool m_hasEndedInStart = false;    // used on the starting thread only
  std::atomic<bool> m_isOver{false}; // the coroutine continues, or has been destroyed
  boost::optional<Outcome<Value>> m_outcome;
};

} // namespace AwaitDetails

/// An operation that starts when a coroutine awaits it, once. `co_await` returns the result, or throws the operation's
/// exception in its own class. Any type of coroutine can await it.
///
/// The coroutine continues where the callback of the operation would run. If the callback would run within the start of
/// the operation, the coroutine is not suspended at all. Destroying the coroutine while it waits cancels the operation;
/// the coroutine then does not continue. Destroy it only where it cannot continue at the same time, for example on the
/// only thread of its executor.
template <typename Value>
class [[nodiscard]] Awaitable {
public:
  /// Called once with the outcome of the operation.
  using Callback = std::function<void(const Outcome<Value> &)>;
  /// Starts the operation with the callback and a token that cancels it. If it throws, the callback is not called.
  using Start = std::function<void(const CancelToken &, Callback)>;

  /// An operation that `start` starts.
  /// @throws std::bad_alloc
  explicit Awaitable(Start start) : m_state(std::make_shared<State>(std::move(start))) {}
  /// The other object cannot be awaited any more.
  Awaitable(Awaitable &&) noexcept = default;
  Awaitable &operator=(Awaitable &&) = delete;
  /// Cancels the operation if a coroutine waits for it.
  ~Awaitable() {
    if (m_state) {
      m_state->Abandon();
    }
  }

  /// Always false: the operation starts when the coroutine is suspended.
  bool await_ready() const noexcept { return false; }

  /// Starts the operation.
  /// @throws Tarvel::InvalidStateException when it has been awaited before
  /// @throws what the start of the operation throws, such as std::bad_alloc
  bool await_suspend(std::coroutine_handle<> waiting) {
    if (!m_state || m_state->IsStarted()) {
      throw Tarvel::InvalidStateException("This operation has already been awaited");
    }
    return State::StartFor(waiting, std::shared_ptr<State>(m_state));
  }

  /// The result.
  /// @throws the exception of a failure, in its own class.
  Value await_resume() const { return m_state->GetResult(); }

private:
  using State = AwaitDetails::AwaitState<Value>;

  std::shared_ptr<State> m_state; // null when this was moved from
};

} // namespace SsoClient

#endif
