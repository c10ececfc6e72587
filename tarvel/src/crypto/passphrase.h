// SPDX-License-Identifier: Apache-2.0
/// @file
/// A passphrase that is asked for when it is first needed, and wiped.

#pragma once

#include "crypto/openssl_guard.h"

#include <tarvel/core/secret_text.h>
#include <tarvel/crypto/private_key.h>

#include <string>

namespace Tarvel::Crypto {

/// Asks its callback at most once, on the thread that first needs the passphrase.
class Passphrase {
public:
  /// `ask`, and `guard` in the middle of which it is called, must live as long as this.
  Passphrase(const PassphraseCallback &ask, OpenSslGuard &guard) : m_ask(ask), m_guard(guard) {}
  Passphrase(const Passphrase &) = delete;
  Passphrase &operator=(const Passphrase &) = delete;

  /// The passphrase, wiped with this object.
  /// @throws WrongPassphraseException when there is no callback; whatever the callback throws; InvalidStateException when
  ///         OpenSSL has cleaned itself up meanwhile.
  const std::string &Get();

private:
  SecretText Ask();

  const PassphraseCallback &m_ask;
  OpenSslGuard &m_guard;
  bool m_asked = false;
  SecretText m_text;
};

} // namespace Tarvel::Crypto
