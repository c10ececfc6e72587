// SPDX-License-Identifier: Apache-2.0

#include "crypto/passphrase.h"

#include "system/fork_gate.h"

#include <tarvel/core/secure_wipe.h>

namespace Tarvel::Crypto {

Passphrase::~Passphrase() {
  SecureWipe(m_text);
}

// Asking may take as long as somebody types, and may start a program that asks.
std::string Passphrase::Ask() {
  m_guard.Suspend();
  try {
    std::string answer = [this] {
      const System::HostCall call;
      return m_ask();
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
    std::string answer = Ask();
    m_text.swap(answer); // needs no memory, so that nothing is thrown before the answer is wiped
    SecureWipe(answer);  // a short text is not moved but copied: what is left of the answer is a secret too
  }
  m_guard.Require();
  return m_text;
}

} // namespace Tarvel::Crypto
