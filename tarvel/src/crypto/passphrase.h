// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Passphrase`, which asks the host for a passphrase when it is first needed, and wipes it.

#pragma once

#include "crypto/openssl_guard.h"
#include "crypto/provider_turn.h"

#include <tarvel/core/secret_text.h>
#include <tarvel/crypto/private_key.h>

#include <string>

namespace Tarvel::Crypto {

/// Asks its callback at most once, on the thread that first needs the passphrase.
class Passphrase {
public:
  /// `ask`, `guard` and `turn`, which may be null, must outlive this object. `guard` and `turn` are suspended while `ask`
  /// runs.
  Passphrase(const PassphraseCallback &ask, OpenSslGuard &guard, ProviderTurn *turn)
      : m_ask(ask), m_guard(guard), m_turn(turn) {}
  Passphrase(const Passphrase &) = delete;
  Passphrase &operator=(const Passphrase &) = delete;

  /// The passphrase, valid as long as this object.
  /// @throws WrongPassphraseException when there is no callback; what the callback throws; InvalidStateException when
  ///         OpenSSL has cleaned itself up in the meantime.
  const std::string &Get();

private:
  SecretText Ask();
  void Resume();

  const PassphraseCallback &m_ask;
  OpenSslGuard &m_guard;
  ProviderTurn *const m_turn;
  bool m_asked = false;
  SecretText m_text;
};

} // namespace Tarvel::Crypto
