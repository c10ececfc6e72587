// SPDX-License-Identifier: Apache-2.0
/// @file
/// `WipedText`, a secret that waits for its use.

#pragma once

#include <tarvel/core/secure_wipe.h>

#include <string>

namespace SsoClient {

/// A text of which every copy is overwritten before its memory is freed. It cannot be formatted or assigned.
class WipedText {
public:
  explicit WipedText(const std::string &text) : m_text(text) {}
  WipedText(const WipedText &) = default;
  WipedText &operator=(const WipedText &) = delete;
  ~WipedText() { Tarvel::SecureWipe(m_text); }

  const std::string &Get() const noexcept { return m_text; }

private:
  std::string m_text;
};

} // namespace SsoClient
