// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OpenSslCleanUpNotice`, for objects whose operations would wait forever after OpenSSL has cleaned itself up.

#pragma once

#include "core/fork_gate.h"

namespace Tarvel::Crypto {

/// Calls a function when OpenSSL cleans itself up, on the thread that runs the clean-up. By then, no use of OpenSSL can
/// begin any more, and those under way have ended or the wait for them has timed out. The function is not called in a
/// child process that is forked later.
class OpenSslCleanUpNotice {
public:
  using Function = void (*)(void *owner) noexcept;

  /// Until `Withdraw` has returned, `function` may be called with `owner`, at most once. The function must not create
  /// or withdraw a notice.
  OpenSslCleanUpNotice(Function function, void *owner) noexcept;
  OpenSslCleanUpNotice(const OpenSslCleanUpNotice &) = delete;
  OpenSslCleanUpNotice &operator=(const OpenSslCleanUpNotice &) = delete;
  ~OpenSslCleanUpNotice() { Withdraw(); }

  /// Ends the notice, after waiting for a call that is under way. May be called any number of times.
  void Withdraw() noexcept;

  /// Calls the functions of all notices, each once.
  static void CallAll() noexcept;

private:
  const Function m_function;
  void *const m_owner;
  const unsigned m_generation = GetForkGeneration();
  // The neighbours in a list of all notices. A mutex guards the list.
  OpenSslCleanUpNotice *m_previous = nullptr;
  OpenSslCleanUpNotice *m_next = nullptr;
};

} // namespace Tarvel::Crypto
