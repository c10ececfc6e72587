// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OpenSslEndNotice`, for objects whose operations would wait forever once OpenSSL has cleaned itself up.

#pragma once

#include "core/fork_gate.h"

namespace Tarvel::Crypto {

/// Calls a function when OpenSSL cleans itself up: on the thread that ends the process, when no use of OpenSSL can begin and
/// those under way have ended. The function is not called in a child process that is forked later.
class OpenSslEndNotice {
public:
  using Function = void (*)(void *owner) noexcept;

  /// Until `Withdraw` has returned, `function` may be called with `owner`, at most once. It must not create or withdraw a
  /// notice.
  OpenSslEndNotice(Function function, void *owner) noexcept;
  OpenSslEndNotice(const OpenSslEndNotice &) = delete;
  OpenSslEndNotice &operator=(const OpenSslEndNotice &) = delete;
  ~OpenSslEndNotice() { Withdraw(); }

  /// Ends the notice, after waiting for a call that is under way. May be called any number of times.
  void Withdraw() noexcept;

  /// Calls the functions of all notices, each once.
  static void CallAll() noexcept;

private:
  const Function m_function;
  void *const m_owner;
  const unsigned m_generation = GetForkGeneration();
  // In a list of all notices, guarded by its mutex.
  OpenSslEndNotice *m_previous = nullptr;
  OpenSslEndNotice *m_next = nullptr;
};

} // namespace Tarvel::Crypto
