// SPDX-License-Identifier: Apache-2.0
/// @file
/// Using OpenSSL on threads that run until the process ends, and so while OpenSSL takes itself down.

#pragma once

namespace Tarvel::Crypto {

/// Around short uses of OpenSSL on a thread that nobody joins. OpenSSL's clean-up, which runs when the process ends or the
/// host asks for it, waits a moment for the uses that are going on; later ones are told to keep away.
class OpenSslUse {
public:
  OpenSslUse() noexcept;
  OpenSslUse(const OpenSslUse &) = delete;
  OpenSslUse &operator=(const OpenSslUse &) = delete;
  ~OpenSslUse();

  /// False once the clean-up has begun: then OpenSSL must not be called any more, not even to free what it made.
  explicit operator bool() const noexcept { return m_isAllowed; }

  /// @throws CryptoException once the clean-up has begun.
  void Require() const;

  /// Has OpenSSL tell of its clean-up. Called before the first use; any number of times.
  /// @throws CryptoException
  static void Prepare();

  /// Takes over an object of OpenSSL's that can no longer be freed. It stays reachable, so that whoever looks for leaks
  /// sees it for what it is.
  static void Abandon(void *object) noexcept;

private:
  const bool m_isAllowed;
};

} // namespace Tarvel::Crypto
