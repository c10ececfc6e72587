// SPDX-License-Identifier: Apache-2.0
/// @file
/// Where OpenSSL's errors become ours: a scope that keeps the calling thread's error queue as the host left it.

#pragma once

#include "core/fork_gate.h"

#include <string>

namespace Tarvel::Crypto {

/// Around calls of OpenSSL. What they put on the calling thread's error queue is gone when the scope ends; what was
/// there before stays. Nobody forks meanwhile.
class OpenSslErrorScope {
public:
  OpenSslErrorScope() noexcept;
  OpenSslErrorScope(const OpenSslErrorScope &) = delete;
  OpenSslErrorScope &operator=(const OpenSslErrorScope &) = delete;
  ~OpenSslErrorScope();

  /// Whether memory ran out within OpenSSL since the scope began. To be asked when a call has failed, or has answered no.
  bool RanOutOfMemory() const;

  /// Before a failure, or a no, is taken for more than that. @throws OutOfMemoryException when memory ran out.
  void RequireMemory() const;

  /// OpenSSL's code for the newest error since the scope began; 0 when there is none.
  unsigned long PeekNewest() const noexcept;

  /// OpenSSL's own words for all errors since the scope began, oldest first. When the host had left errors on the queue,
  /// only the newest, for the older ones cannot be read without taking the host's.
  std::string TakeText() const;

  /// @throws OutOfMemoryException when memory ran out.
  /// @throws CryptoException with `message`, followed by ": " and `TakeText` when there is any.
  [[noreturn]] void Throw(const std::string &message) const;

  /// `message` as `Throw` writes it. @throws OutOfMemoryException when memory ran out.
  std::string Describe(const std::string &message) const;

private:
  const Computation m_computing;
  /// Takes the errors off the queue.
  void Collect() const;
  void Note(unsigned long code, const char *data, int flags) const;

  const int m_errnoOfHost;
  const char *m_newestOfHost = nullptr; // an entry's own copy of a file name, and so its identity; null for none
  // What has been collected so far.
  mutable bool m_ranOutOfMemory = false;
  mutable unsigned long m_newest = 0;
  mutable std::string m_text;
};

} // namespace Tarvel::Crypto
