// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CancelSource` and `CancelToken`, with which a program cancels operations.

#pragma once

#include <ssoclient/export.h>

#include <functional>
#include <memory>
#include <utility>
#if __cplusplus >= 202002L && __has_include(<stop_token>)
#include <stop_token>
#endif

namespace SsoClient {

/// What a source and its tokens share. Not for callers.
class CancelState;

/// Keeps a function registered. Destroying this object removes the function, and does not wait if the function is
/// already running. Can be moved, not copied.
class SSOCLIENT_API CancelRegistration {
public:
  /// Registers nothing.
  CancelRegistration() noexcept = default;
  /// Not for callers: `CancelToken::OnCancel` makes registrations.
  explicit CancelRegistration(std::shared_ptr<void> entry) noexcept : m_entry(std::move(entry)) {}
  /// The other object then registers nothing.
  CancelRegistration(CancelRegistration &&) noexcept = default;
  /// Removes the function that was registered before. The other object then registers nothing.
  CancelRegistration &operator=(CancelRegistration &&) noexcept = default;
  ~CancelRegistration() = default;

private:
  std::shared_ptr<void> m_entry; // removes the function when it is destroyed
};

/// Whether an operation was cancelled. A value; safe on any thread. A token that is made without a source is never cancelled.
class SSOCLIENT_API CancelToken {
public:
  /// Never cancelled.
  CancelToken() noexcept = default;

#ifdef __cpp_lib_jthread
  /// Cancelled when `token` is requested to stop. Implicit, so that a `std::stop_token` can be passed wherever a
  /// `CancelToken` is expected. Only for programs in C++20 or later.
  /// @throws std::bad_alloc
  CancelToken(std::stop_token token);
#endif

  /// A token that is cancelled when either of two is: for example the token of one request, and that of the whole program.
  /// @throws std::bad_alloc
  static CancelToken AnyOf(const CancelToken &first, const CancelToken &second);

  /// Whether the source has cancelled.
  bool IsCancelled() const noexcept;

  /// Whether there is a source that can cancel, or has cancelled.
  bool CanBeCancelled() const noexcept {
    return m_state != nullptr;
  }

  /// Calls `function` once when the source cancels, on the thread that cancels. If the source has cancelled already,
  /// calls it at once, in this call. Functions are called in the order in which they were registered, and no lock is
  /// held: `function` may cancel, register functions and remove them. It must not block. What it throws is logged
  /// (logger "SsoClient", level 8). In a child that `fork` makes, the functions of its parent are not called.
  /// @return what keeps the function registered, and frees its memory
  /// @throws Tarvel::InvalidArgumentException when `function` is empty
  /// @throws std::bad_alloc
  CancelRegistration OnCancel(std::function<void()> function) const;

private:
  friend class CancelSource;
  explicit CancelToken(std::shared_ptr<CancelState> state) noexcept : m_state(std::move(state)) {}

  std::shared_ptr<CancelState> m_state; // null if it is never cancelled
};

/// Cancels the operations that were started with its tokens. Copies cancel the same tokens, and moving a source copies
/// it. Safe on any thread.
class SSOCLIENT_API CancelSource {
public:
  /// @throws std::bad_alloc
  CancelSource();
  /// A source that cancels the same tokens.
  CancelSource(const CancelSource &) noexcept = default;
  /// From now on this source cancels the tokens of the other source.
  CancelSource &operator=(const CancelSource &) noexcept = default;
  ~CancelSource() = default;

  /// A token that this source cancels.
  CancelToken GetToken() const noexcept { return CancelToken(m_state); }

  /// Cancels all tokens of this source. Further calls do nothing. Does not wait: the operations end at once with
  /// `CancelledException`, on their executors.
  void Cancel() const noexcept;

  /// Whether `Cancel` has been called.
  bool IsCancelled() const noexcept;

private:
  std::shared_ptr<CancelState> m_state; // never null
};

#ifdef __cpp_lib_jthread
/// Lets a `std::stop_token` cancel. Not for callers.
class StopTokenBridge {
public:
  /// A bridge that cancels its source when `token` is requested to stop.
  /// @throws std::bad_alloc
  static std::shared_ptr<StopTokenBridge> Make(std::stop_token token) {
    auto bridge = std::make_shared<StopTokenBridge>();
    bridge->m_callback = std::make_unique<std::stop_callback<Canceller>>(std::move(token), Canceller{bridge});
    return bridge;
  }

  /// What the bridge cancels.
  const CancelSource &GetSource() const noexcept { return m_source; }

private:
  /// Shares the bridge while it cancels. If another thread releases the bridge while registered functions run, that
  /// thread does not wait for them. Without the share, the destructor of `std::stop_callback` would wait.
  struct Canceller {
    void operator()() const noexcept {
      if (const std::shared_ptr<StopTokenBridge> shared = bridge.lock()) {
        shared->m_source.Cancel();
      }
    }

    std::weak_ptr<StopTokenBridge> bridge;
  };

  CancelSource m_source;
  std::unique_ptr<std::stop_callback<Canceller>> m_callback;
};

inline CancelToken::CancelToken(std::stop_token token) {
  if (token.stop_possible()) {
    const std::shared_ptr<StopTokenBridge> bridge = StopTokenBridge::Make(std::move(token));
    m_state = std::shared_ptr<CancelState>(bridge, bridge->GetSource().GetToken().m_state.get());
  }
}
#endif

} // namespace SsoClient
