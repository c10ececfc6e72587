// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SecretText`, the owner of a password, a passphrase or any other text that must not stay in memory.

#pragma once

#include <tarvel/core/export.h>

#include <iosfwd>
#include <string>
#include <string_view>

namespace Tarvel {

/// A text whose memory is overwritten before it is freed, also when the text grows, is replaced or is moved from. It cannot be
/// printed, and a plain text never becomes one without a constructor being named. Safe for any number of readers on any threads
/// while nobody changes it.
///
/// A copy of what `Get` returns is an ordinary text again, and so is what the text was made from by the first constructor: their
/// owners overwrite them (`SecureWipe`).
class TARVEL_API SecretText {
public:
  /// The empty text.
  SecretText() noexcept = default;

  /// A copy of `text`.
  explicit SecretText(std::string_view text) : m_text(text) {}

  /// A copy of the null-terminated `text`, which is not null.
  explicit SecretText(const char *text) : m_text(text) {}

  /// Takes over what `text` holds and leaves it empty and overwritten.
  explicit SecretText(std::string &&text) noexcept;

  SecretText(const SecretText &other) = default;
  SecretText(SecretText &&other) noexcept;
  SecretText &operator=(const SecretText &other);
  SecretText &operator=(SecretText &&other) noexcept;
  ~SecretText();

  /// The text, valid until this object changes or goes.
  const std::string &Get() const noexcept { return m_text; }

  /// Appends `text`, which is not part of this one. Memory that the text outgrows is overwritten.
  void Append(std::string_view text);

  /// Nothing prints a secret.
  friend std::ostream &operator<<(std::ostream &, const SecretText &) = delete;

private:
  std::string m_text;
};

} // namespace Tarvel
