// SPDX-License-Identifier: Apache-2.0
/// @file
/// The characters that are escaped in XML text and attribute values: one table for the serialiser and the canonicaliser.

#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>

namespace Tarvel::Xml {

/// Why a character is escaped, as bits.
enum EscapeSet : std::uint8_t {
  ESCAPED_IN_TEXT = 1,      ///< '&', '<', '>' (it must not follow "]]") and CR, which a parser would turn into LF
  ESCAPED_IN_ATTRIBUTE = 2, ///< '&', '<', '"' and TAB, LF and CR, which a parser would turn into spaces
  ESCAPED_IN_ASCII = 4,     ///< every byte of a character beyond ASCII
};

/// For each byte, the sets that it belongs to. Canonical XML 1.0, section 2.3, escapes the same characters that a
/// serialiser must escape.
constexpr std::array<std::uint8_t, 256> ESCAPE_SETS = [] {
  std::array<std::uint8_t, 256> sets{};
  sets['&'] = sets['<'] = sets['\r'] = ESCAPED_IN_TEXT | ESCAPED_IN_ATTRIBUTE;
  sets['>'] = ESCAPED_IN_TEXT;
  sets['"'] = sets['\t'] = sets['\n'] = ESCAPED_IN_ATTRIBUTE;
  for (std::size_t byte = 0x80; byte < sets.size(); ++byte) {
    sets[byte] = ESCAPED_IN_ASCII;
  }
  return sets;
}();

/// The escape of an ASCII character that belongs to one of the sets.
constexpr std::string_view EscapeOf(char character) noexcept {
  switch (character) {
  case '&':
    return "&amp;";
  case '<':
    return "&lt;";
  case '>':
    return "&gt;";
  case '"':
    return "&quot;";
  case '\t':
    return "&#x9;";
  case '\n':
    return "&#xA;";
  default:
    return "&#xD;";
  }
}

/// Most of a text needs no escape, so 16 bytes at a time are checked.
using EscapeBlock = unsigned char __attribute__((vector_size(16)));

/// Whether one of the 16 bytes from `bytes` on belongs to `SETS`, a combination of `EscapeSet`.
template <unsigned SETS>
inline bool HasEscaped(const char *bytes) noexcept {
  EscapeBlock block;
  std::memcpy(&block, bytes, sizeof block);
  auto found = (block == '&') | (block == '<') | (block == '\r');
  if constexpr ((SETS & ESCAPED_IN_TEXT) != 0) {
    found |= block == '>';
  }
  if constexpr ((SETS & ESCAPED_IN_ATTRIBUTE) != 0) {
    found |= (block == '"') | (block == '\t') | (block == '\n');
  }
  if constexpr ((SETS & ESCAPED_IN_ASCII) != 0) {
    found |= block >= 0x80;
  }
  std::array<std::uint64_t, 2> halves;
  static_assert(sizeof halves == sizeof found);
  std::memcpy(&halves, &found, sizeof halves);
  return (halves[0] | halves[1]) != 0;
}

/// The first byte from `from` to `end` that belongs to `SETS`, a combination of `EscapeSet`, or `end`.
template <unsigned SETS>
inline const char *FindEscaped(const char *from, const char *end) noexcept {
  constexpr std::size_t BLOCK_BYTES = sizeof(EscapeBlock);
  const char *const begin = from;
  while (static_cast<std::size_t>(end - from) >= BLOCK_BYTES && !HasEscaped<SETS>(from)) {
    from += BLOCK_BYTES;
  }
  // If fewer bytes than a block remain of a text that is long enough, its last 16 bytes are checked as one more block.
  const bool isLastBlock = static_cast<std::size_t>(end - from) < BLOCK_BYTES;
  if (isLastBlock && static_cast<std::size_t>(end - begin) >= BLOCK_BYTES && !HasEscaped<SETS>(end - BLOCK_BYTES)) {
    return end;
  }
  while (from != end && !(ESCAPE_SETS[static_cast<unsigned char>(*from)] & SETS)) {
    ++from;
  }
  return from;
}

} // namespace Tarvel::Xml
