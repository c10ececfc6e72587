// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ProviderTurn`, with which threads use the keys of added providers one after the other.

#pragma once

#include "crypto/openssl_handles.h"

namespace Tarvel::Crypto {

/// Whether `key` is in a provider that the machine's configuration has added, such as one for a TPM.
bool IsInAddedProvider(const EVP_PKEY *key) noexcept;

/// Only one thread at a time has a turn that is needed; others that need one wait for it. Some providers for hardware
/// are not safe on several threads (tpm2-openssl 1.1 is not), and hardware does one operation after the other anyway.
/// OpenSSL's own providers need no turns.
class ProviderTurn {
public:
  /// Waits for the turn of this thread and begins it, if `isNeeded`. Otherwise the object does nothing.
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
