// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/secret_text.h>

#include "core/wiped_growth.h"

#include <tarvel/core/secure_wipe.h>

#include <utility>

namespace Tarvel {

// `swap` copies a short text, which is inside the string object, and leaves its bytes there: so the source is
// overwritten.
SecretText::SecretText(std::string &&text) noexcept {
  m_text.swap(text);
  SecureWipe(text);
}

SecretText::SecretText(SecretText &&other) noexcept : SecretText(std::move(other.m_text)) {}

SecretText &SecretText::operator=(const SecretText &other) {
  return *this = SecretText(other);
}

SecretText &SecretText::operator=(SecretText &&other) noexcept {
  if (this != &other) {
    SecureWipe(m_text);
    // Without memory of its own, `m_text` exchanges no pointer for a short text, whose bytes would then be out of
    // reach.
    std::string().swap(m_text);
    m_text.swap(other.m_text);
    SecureWipe(other.m_text);
  }
  return *this;
}

SecretText::~SecretText() {
  SecureWipe(m_text);
}

void SecretText::Append(std::string_view text) {
  AppendWiping(m_text, text);
}

std::string SecretText::Take() noexcept {
  std::string text;
  text.swap(m_text);
  SecureWipe(m_text);
  return text;
}

} // namespace Tarvel
