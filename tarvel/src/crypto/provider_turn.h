// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ProviderTurn`, with which threads use the keys of added providers one after the other.

#pragma once

#include "crypto/openssl_handles.h"

namespace Tarvel::Crypto {

/// Whether `key` is in a provider that the machine's configuration has added, such as one for a TPM.
bool IsInAddedProvider(const EVP_PKEY *key) noexcept;

/// While one exists that is needed, every other thread that needs one waits. Some providers for hardware are not safe on
/// several threads (tpm2-openssl 1.1 is not), and hardware does one operation after the other anyway. OpenSSL's own
/// providers need no turns.
class ProviderTurn {
public:
  /// Begins the turn, if `isNeeded`.
  explicit ProviderTurn(bool isNeeded);
  ProviderTurn(const ProviderTurn &) = delete;
  ProviderTurn &operator=(const ProviderTurn &) = delete;
  ~ProviderTurn();

  /// `Suspend` lets other threads have their turns while the host's code runs. `Resume` waits for this thread's turn again.
  void Suspend() noexcept;
  void Resume();

private:
  const bool m_isNeeded;
  bool m_isUnderWay = false;
};

} // namespace Tarvel::Crypto
