// SPDX-License-Identifier: Apache-2.0
/// @file
/// Letter case, printable and shortened texts for messages, Base64 and UUID texts.

#pragma once

#include <tarvel/core/export.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace Tarvel {

/// Text functions of the platform. They keep no state, ignore the process's locale, and are safe on any thread.
class TARVEL_API StringUtil {
public:
  StringUtil() = delete;

  /// The upper-case form of UTF-8 text by Unicode's simple case mapping (one character to one character), as defined by
  /// the C library's locale C.UTF-8; on a system without that locale only ASCII letters are mapped. Bytes that are not
  /// UTF-8 stay as they are.
  static std::string ToUpper(std::string_view text);

  /// The lower-case form, by the same rules.
  static std::string ToLower(std::string_view text);

  /// The maximum length of a value in a message, in bytes.
  static constexpr std::size_t MAX_VALUE_BYTES = 1024;

  /// The maximum length of a line in a log or on a terminal, in bytes.
  static constexpr std::size_t MAX_LINE_BYTES = 7 * 1024;

  /// `text` in the form for messages: all of it when it has at most `most` bytes; otherwise its first `most` bytes, or
  /// up to three fewer so that no UTF-8 character is split, then "... (N more bytes)".
  static std::string Shorten(std::string_view text, std::size_t most = MAX_VALUE_BYTES);

  /// `text`, which is UTF-8, with \\uXXXX in place of each character that could control a terminal or begin a new line:
  /// control characters, line and paragraph separators, and characters that change the direction of text. An octet that is
  /// not part of a UTF-8 sequence is escaped like the character with its number, from 80 to 9F, or stays as it is.
  static std::string Printable(std::string_view text);

  /// A new random UUID (RFC 4122, version 4) as 36 lower-case characters, from the system's random source, or from the
  /// source of a `ScopedEnvironment`.
  static std::string GenerateUuid();

  /// Base64 (RFC 4648, section 4) with padding and without line breaks.
  static std::string Base64Encode(const std::uint8_t *data, std::size_t length);
  static std::string Base64Encode(const std::vector<std::uint8_t> &data);

  /// The bytes of Base64 text. XML white space (tab, line feed, carriage return, blank) is allowed anywhere.
  /// @throws Base64FormatException for any other character, wrong or misplaced padding, padding bits that are not zero,
  ///         or a length that no encoding has.
  static std::vector<std::uint8_t> Base64Decode(std::string_view text);
};

/// The number of characters that `Base64_Encode` writes for `length` bytes, without a terminator.
TARVEL_API std::size_t Base64_EncodedLength(std::size_t length);

/// Writes the Base64 form of `length` bytes at `data` to `out`, which must have space for
/// `Base64_EncodedLength(length)` characters. Returns the number of characters written; no terminator is written.
TARVEL_API std::size_t Base64_Encode(const std::uint8_t *data, std::size_t length, char *out);

} // namespace Tarvel
