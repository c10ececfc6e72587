// SPDX-License-Identifier: Apache-2.0
/// @file
/// Which bytes are UTF-8, and which characters XML 1.0 (fifth edition) allows in text and in names.

#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace Tarvel::Xml {

constexpr std::uint32_t NO_CHARACTER = 0xFFFFFFFF;

/// Reads the character that begins at `offset`, which is less than the text's size, and moves `offset` past it.
/// @return its code point, or `NO_CHARACTER` if the bytes there are not UTF-8; `offset` is then unchanged.
std::uint32_t ReadCharacter(std::string_view text, std::size_t &offset) noexcept;

/// The offset of the first byte that is not part of well-formed UTF-8, or `npos`.
std::size_t FindInvalidUtf8(std::string_view text) noexcept;

/// The reason why an XML 1.0 document cannot contain `text` ("... holds the character U+0001, ..."); empty if it can.
/// The message begins with `what`.
std::string DescribeForbiddenCharacter(std::string_view what, std::string_view text);

/// Whether a name without a colon (NCName) may begin with the character (NameStartChar, production 4), or continue with it
/// (NameChar, production 4a).
bool IsNameStart(std::uint32_t character) noexcept;
bool IsNameCharacter(std::uint32_t character) noexcept;

/// Whether XML 1.0 allows the character (Char, production 2).
bool IsXmlCharacter(std::uint32_t character) noexcept;

/// The character in the form "U+0041".
std::string FormatCharacter(std::uint32_t character);

/// Writes the character as UTF-8. @param target has space for four bytes. @return the end of what was written.
char *WriteCharacter(std::uint32_t character, char *target) noexcept;

/// Whether `name` is an NCName: a name without a colon.
bool IsNcName(std::string_view name) noexcept;

} // namespace Tarvel::Xml
