// SPDX-License-Identifier: Apache-2.0

#include "crypto/passphrase.h"

#include "core/fork_gate.h"

namespace Tarvel::Crypto {

// The guard is suspended because the callback may wait while the user types, or start a program that asks.
SecretText Passphrase::Ask() {
  m_guard.Suspend();
  if (m_turn) {
    m_turn->Suspend();
  }
  try {
    SecretText answer = [this] {
      const HostCall call;
      return SecretText(m_ask());
    }();
    Resume();
    return answer;
  } catch (...) {
    Resume();
    throw;
  }
}

void Passphrase::Resume() {
  m_guard.Resume();
  if (m_turn) {
    m_turn->Resume();
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
