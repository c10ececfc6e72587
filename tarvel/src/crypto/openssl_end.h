// SPDX-License-Identifier: Apache-2.0
/// @file
/// Being called when OpenSSL cleans itself up, for objects whose operations would wait for something else for ever.

#pragma once

#include "core/fork_gate.h"

namespace Tarvel::Crypto {

/// Has a function called, on the thread that ends the process, once no use of OpenSSL may begin any more and those that
/// were going on have ended. Not in a child process that `fork` made later.
class OpenSslEndNotice {
public:
  using Function = void (*)(void *owner) noexcept;

  /// Until `Withdraw` has returned, `function` may be called with `owner`, at most once. It must not create or withdraw a
  /// notice.
  OpenSslEndNotice(Function function, void *owner) noexcept;
  OpenSslEndNotice(const OpenSslEndNotice &) = delete;
  OpenSslEndNotice &operator=(const OpenSslEndNotice &) = delete;
  ~OpenSslEndNotice() { Withdraw(); }

  /// Waits for a call that is under way. Any number of times.
  void Withdraw() noexcept;

  /// Calls all that there are, and forgets them.
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
