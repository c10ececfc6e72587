// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OpenSslErrorScope`, which turns OpenSSL's errors into exceptions and preserves the host's error queue.

#pragma once

#include "core/fork_gate.h"

#include <string>

namespace Tarvel::Crypto {

/// A scope around calls of OpenSSL. The end of the scope removes the errors that the calls put on the calling thread's queue,
/// and leaves those that were there before. A fork waits until the scope ends.
class OpenSslErrorScope {
public:
  OpenSslErrorScope() noexcept;
  OpenSslErrorScope(const OpenSslErrorScope &) = delete;
  OpenSslErrorScope &operator=(const OpenSslErrorScope &) = delete;
  ~OpenSslErrorScope();

  /// Whether memory ran out within OpenSSL since the scope began. For use after a call that failed or answered "no".
  bool RanOutOfMemory() const;

  /// Call this before a failure or a "no" is treated as an answer. @throws OutOfMemoryException when memory ran out.
  void RequireMemory() const;

  /// OpenSSL's code for the newest error since the scope began; 0 when there is none.
  unsigned long PeekNewest() const noexcept;

  /// OpenSSL's texts for all errors since the scope began, oldest first. If the queue had errors of the host, only the
  /// newest text is returned: the older errors cannot be read without removing those of the host.
  std::string TakeText() const;

  /// @throws OutOfMemoryException when memory ran out.
  /// @throws CryptoException with `message`, followed by ": " and the result of `TakeText` if that is not empty.
  [[noreturn]] void Throw(const std::string &message) const;

  /// The message that `Throw` would use. @throws OutOfMemoryException when memory ran out.
  std::string Describe(const std::string &message) const;

private:
  const Computation m_computing;
  /// Reads the errors in the queue into the members below.
  void Collect() const;
  void Note(unsigned long code, const char *data, int flags) const;

  const int m_hostErrno;
  const char *m_newestHostError = nullptr; // identifies the entry: its own copy of a file name; null if there is none
  // What has been collected so far.
  mutable bool m_ranOutOfMemory = false;
  mutable unsigned long m_newest = 0;
  mutable std::string m_text;
};

} // namespace Tarvel::Crypto
