// SPDX-License-Identifier: Apache-2.0

#include "crypto/passphrase.h"

#include "core/fork_gate.h"

namespace Tarvel::Crypto {

// The guard is suspended because the callback may wait while the user types, or start a program that asks.
SecretText Passphrase::Ask() {
  m_guard.Suspend();
  try {
    SecretText answer = [this] {
      const HostCall call;
      return SecretText(m_ask());
    }();
    m_guard.Resume();
    return answer;
  } catch (...) {
    m_guard.Resume();
    throw;
  }
}

const std::string &Passphrase::Get() {
  if (!m_ask) {
    throw WrongPassphraseException("The private key is encrypted and there is no passphrase");
  }
  if (!m_asked) {
    m_asked = true;
    m_text = Ask();
  }
  m_guard.Require();
  return m_text.Get();
}

} // namespace Tarvel::Crypto
