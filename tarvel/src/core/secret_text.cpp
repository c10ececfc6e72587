// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/secret_text.h>

#include "core/wiped_growth.h"

#include <tarvel/core/secure_wipe.h>

#include <utility>

namespace Tarvel {

// A short text is not moved by `swap` but copied, so that the source is overwritten in each case.
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

} // namespace Tarvel
