// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OpenSslGuard`, for uses of OpenSSL on threads that may still run when OpenSSL cleans itself up.

#pragma once

#include "core/fork_gate.h"

#include <atomic>
#include <cstdint>

namespace Tarvel::Crypto {

/// Guards a short use of OpenSSL on a thread that may still run when the process ends. OpenSSL's clean-up, which runs at the
/// end of the process or when the host calls it, waits briefly for the uses under way; later uses are refused. A fork waits
/// for the uses under way, too.
class OpenSslGuard {
public:
  OpenSslGuard() noexcept;
  OpenSslGuard(const OpenSslGuard &) = delete;
  OpenSslGuard &operator=(const OpenSslGuard &) = delete;
  ~OpenSslGuard();

  /// Whether OpenSSL may be called. False if the clean-up began before the use or before `Resume`, and while the use is
  /// suspended. OpenSSL must then not be called even to free what it made.
  explicit operator bool() const noexcept { return m_count != nullptr; }

  /// @throws InvalidStateException with the text `ENDED` when OpenSSL must not be called.
  void Require() const;

  static constexpr const char *ENDED = "OpenSSL has cleaned itself up: the process is about to end";

  /// `Suspend` interrupts the use while the host's code runs, which may block or fork. `Resume` continues it, and returns
  /// false if the clean-up has begun.
  void Suspend() noexcept;
  bool Resume() noexcept;

  /// Initialises OpenSSL and registers for its clean-up. Call this before the first use; more calls do no harm.
  /// @throws CryptoException, OutOfMemoryException, and InvalidStateException when OpenSSL has cleaned itself up.
  static void Prepare();

  /// Takes over an OpenSSL object that can no longer be freed. It stays reachable, so that leak checkers do not report it.
  static void Abandon(void *object) noexcept;

private:
  const Computation m_computing;
  // Of the shard where the use began or was resumed last; null if the use is suspended or not allowed.
  std::atomic<std::uint32_t> *m_count;
};

} // namespace Tarvel::Crypto
