// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CancelSource` and `CancelToken`, with which a program cancels operations.

#pragma once

#include <ssoclient/export.h>

#include <functional>
#include <memory>
#if __cplusplus >= 202002L && __has_include(<stop_token>)
#include <stop_token>
#endif

namespace SsoClient {

/// What a source and its tokens share. Not for callers.
class CancelState;

/// Keeps a function registered; destroying it removes the function. It does not wait for a function that is already
/// running. Movable.
class SSOCLIENT_API CancelRegistration {
public:
  /// Registers nothing.
  CancelRegistration() noexcept = default;
  /// Not for callers: `CancelToken::OnCancel` makes registrations.
  explicit CancelRegistration(std::shared_ptr<void> entry) noexcept : m_entry(std::move(entry)) {}

private:
  std::shared_ptr<void> m_entry; // removes the function when it is destroyed
};

/// Whether an operation was cancelled. A value; safe on any thread. A token that is made without a source is never cancelled.
class SSOCLIENT_API CancelToken {
public:
  /// Never cancelled.
  CancelToken() noexcept = default;

#if defined(__cpp_lib_jthread)
  /// Cancelled when `token` is requested to stop.
  /// @throws std::bad_alloc
  CancelToken(std::stop_token token);
#endif

  /// Whether the source has cancelled.
  bool IsCancelled() const noexcept;

  /// Whether there is a source that can cancel, or has cancelled.
  bool CanBeCancelled() const noexcept { return m_state != nullptr; }

  /// Calls `function` once when the source cancels, on the thread that cancels; at once, in this call, when it has cancelled
  /// already. `function` must not block, and must not throw.
  /// @return what keeps the function registered
  /// @throws std::bad_alloc
  CancelRegistration OnCancel(std::function<void()> function) const;

private:
  friend class CancelSource;
  explicit CancelToken(std::shared_ptr<CancelState> state) noexcept : m_state(std::move(state)) {}

  std::shared_ptr<CancelState> m_state; // null if it is never cancelled
};

/// Cancels the operations that were started with its tokens. Copies cancel the same tokens. Safe on any thread.
class SSOCLIENT_API CancelSource {
public:
  /// @throws std::bad_alloc
  CancelSource();

  /// A token that this source cancels.
  CancelToken GetToken() const noexcept { return CancelToken(m_state); }

  /// Cancels all tokens of this source, once and for good. Does not wait: the operations end at once with `CancelledException`,
  /// on their executors.
  void Cancel() const noexcept;

  /// Whether `Cancel` has been called.
  bool IsCancelled() const noexcept;

private:
  std::shared_ptr<CancelState> m_state;
};

#if defined(__cpp_lib_jthread)
inline CancelToken::CancelToken(std::stop_token token) {
  // TODO in this change: bridge
  static_cast<void>(token);
}
#endif

} // namespace SsoClient
