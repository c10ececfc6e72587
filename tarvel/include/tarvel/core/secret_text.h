// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SecretText`, the owner of a password, a passphrase or any other text that must not stay in memory.

#pragma once

#include <tarvel/core/export.h>

#include <iosfwd>
#include <string>
#include <string_view>

namespace Tarvel {

/// A text whose memory is overwritten before it is freed, also when the text grows, is replaced or is moved from. It
/// cannot be printed, and a plain text becomes one only by an explicit constructor. Any number of threads may read it
/// while none changes it.
///
/// This class does not overwrite other copies: the text from which it was constructed by copying, and a copy that you
/// make of what `Get` returns. Overwrite them with `SecureWipe`.
class TARVEL_API SecretText {
public:
  /// The empty text.
  SecretText() noexcept = default;

  /// A copy of `text`.
  explicit SecretText(std::string_view text) : m_text(text) {}

  /// A copy of the null-terminated `text`, which is not null.
  explicit SecretText(const char *text) : m_text(text) {}

  /// Takes over the content of `text` and leaves `text` empty and overwritten.
  explicit SecretText(std::string &&text) noexcept;

  SecretText(const SecretText &other) = default;
  SecretText(SecretText &&other) noexcept;
  SecretText &operator=(const SecretText &other);
  SecretText &operator=(SecretText &&other) noexcept;
  ~SecretText();

  /// The text, valid until this object is changed or destroyed.
  const std::string &Get() const noexcept { return m_text; }

  /// Appends `text`, which must not be part of this one. Memory that the text outgrows is overwritten.
  void Append(std::string_view text);

  /// Returns the text, and leaves this one empty and overwritten. The result is an ordinary text, which its owner
  /// overwrites.
  std::string Take() noexcept;

  /// A secret cannot be printed.
  friend std::ostream &operator<<(std::ostream &, const SecretText &) = delete;

private:
  std::string m_text;
};

} // namespace Tarvel
