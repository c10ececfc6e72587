// SPDX-License-Identifier: Apache-2.0
/// @file
/// A passphrase that is asked for when it is first needed, and wiped.

#pragma once

#include <tarvel/crypto/private_key.h>

#include <string>

namespace Tarvel::Crypto {

/// Asks its callback at most once, on the thread that first needs the passphrase.
class Passphrase {
public:
  /// `ask` must live as long as this.
  explicit Passphrase(const PassphraseCallback &ask) : m_ask(ask) {}
  Passphrase(const Passphrase &) = delete;
  Passphrase &operator=(const Passphrase &) = delete;
  ~Passphrase();

  /// The passphrase, wiped with this object.
  /// @throws WrongPassphraseException when there is no callback; whatever the callback throws.
  const std::string &Get();

private:
  const PassphraseCallback &m_ask;
  bool m_asked = false;
  std::string m_text;
};

} // namespace Tarvel::Crypto
