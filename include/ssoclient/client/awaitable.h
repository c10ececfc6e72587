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

#include <functional>
#include <memory>
#include <utility>

namespace SsoClient {

/// An operation that starts when a coroutine awaits it, once. The coroutine continues where the callback of the operation
/// would run. Destroying the coroutine while it waits cancels the operation; the coroutine then does not continue.
template <typename Value>
class [[nodiscard]] Awaitable {
public:
  using Callback = std::function<void(const Outcome<Value> &)>;
  /// Starts the operation with the callback and a token that cancels it.
  using Start = std::function<void(const CancelToken &, Callback)>;

  explicit Awaitable(Start start) : m_start(std::move(start)) {}
  // TODO in this change: await_ready, await_suspend, await_resume over a state that is shared with the callback
private:
  Start m_start;
};

} // namespace SsoClient

#endif
