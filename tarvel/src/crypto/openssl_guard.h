// SPDX-License-Identifier: Apache-2.0
/// @file
/// Using OpenSSL on threads that run until the process ends, and so while OpenSSL takes itself down.

#pragma once

#include "system/fork_gate.h"

#include <atomic>
#include <cstdint>

namespace Tarvel::Crypto {

/// Around short uses of OpenSSL on a thread that nobody joins. OpenSSL's clean-up, which runs when the process ends or the
/// host asks for it, waits a moment for the uses that are going on; later ones are told to keep away.
/// Nobody forks during a use.
class OpenSslGuard {
public:
  OpenSslGuard() noexcept;
  OpenSslGuard(const OpenSslGuard &) = delete;
  OpenSslGuard &operator=(const OpenSslGuard &) = delete;
  ~OpenSslGuard();

  /// False once the clean-up has begun: then OpenSSL must not be called any more, not even to free what it made.
  explicit operator bool() const noexcept { return m_count != nullptr; }

  /// @throws InvalidStateException, with `ENDED` for its text, once the clean-up has begun.
  void Require() const;

  static constexpr const char *ENDED = "OpenSSL has cleaned itself up: the process is about to end";

  /// While the code of somebody else runs in the middle of a use, which may take its time, or fork. Afterwards the use goes on;
  /// false once the clean-up has begun.
  void Suspend() noexcept;
  bool Resume() noexcept;

  /// Initialises OpenSSL and has it report its clean-up. Called before the first use; any number of times.
  /// @throws CryptoException, OutOfMemoryException, and InvalidStateException when OpenSSL has cleaned itself up.
  static void Prepare();

  /// Takes over an object of OpenSSL's that can no longer be freed. It stays reachable, so that whoever looks for leaks
  /// sees it for what it is.
  static void Abandon(void *object) noexcept;

private:
  const System::Computation m_computing;
  std::atomic<std::uint32_t> *m_count; // of the lane in which it began; null when it is not allowed
};

} // namespace Tarvel::Crypto
