// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/secret_text.h>

#include "core/wiped_growth.h"

#include <tarvel/core/secure_wipe.h>

#include <utility>

namespace Tarvel {

// The bytes of a short text are inside the string object. `swap` copies them and leaves them in the source, so the
// source is overwritten.
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
    // Frees the memory of `m_text`. Otherwise `swap` would move that memory to `other`, and the bytes of a short text
    // would remain inside `other`, where `SecureWipe` does not reach them.
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
