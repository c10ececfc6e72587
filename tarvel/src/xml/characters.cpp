// SPDX-License-Identifier: Apache-2.0

#include "xml/characters.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstring>
#include <iterator>

namespace Tarvel::Xml {

namespace {

struct Range {
  std::uint32_t first;
  std::uint32_t last;
};

// NameStartChar of XML 1.0, production 4, above ASCII.
constexpr Range NAME_START_RANGES[] = {{0xC0, 0xD6},     {0xD8, 0xF6},     {0xF8, 0x2FF},    {0x370, 0x37D},
                                       {0x37F, 0x1FFF},  {0x200C, 0x200D}, {0x2070, 0x218F}, {0x2C00, 0x2FEF},
                                       {0x3001, 0xD7FF}, {0xF900, 0xFDCF}, {0xFDF0, 0xFFFD}, {0x10000, 0xEFFFF}};

// What NameChar, production 4a, adds above ASCII.
constexpr Range NAME_MORE_RANGES[] = {{0xB7, 0xB7}, {0x300, 0x36F}, {0x203F, 0x2040}};

template <std::size_t N>
bool IsIn(const Range (&ranges)[N], std::uint32_t character) noexcept {
  return std::any_of(std::begin(ranges), std::end(ranges),
                     [character](const Range &range) { return range.first <= character && character <= range.last; });
}

/// For each byte, whether it is an ASCII letter. Nearly all characters of names are.
constexpr std::array<bool, 256> IS_ASCII_LETTER = [] {
  std::array<bool, 256> letters{};
  for (unsigned letter = 0; letter < 26; ++letter) {
    letters['a' + letter] = letters['A' + letter] = true;
  }
  return letters;
}();

std::uint32_t Byte(std::string_view text, std::size_t offset) noexcept {
  return static_cast<unsigned char>(text[offset]);
}

/// The offset of the first byte above 0x7F, or `npos`.
std::size_t FindNonAscii(std::string_view text) noexcept {
  constexpr std::size_t BLOCK = 64; // long enough for a fast loop, short enough to search byte by byte
  constexpr std::uint64_t HIGH_BITS = 0x8080808080808080u;
  std::size_t offset = 0;
  for (; text.size() - offset >= BLOCK; offset += BLOCK) {
    std::uint64_t words[BLOCK / sizeof(std::uint64_t)];
    std::memcpy(words, text.data() + offset, BLOCK);
    std::uint64_t all = 0;
    for (const std::uint64_t word : words) {
      all |= word;
    }
    if (all & HIGH_BITS) {
      break;
    }
  }
  for (; offset < text.size(); ++offset) {
    if (Byte(text, offset) >= 0x80) {
      return offset;
    }
  }
  return std::string_view::npos;
}

/// The length of a prefix of `text` that contains only ASCII characters from the space on. Eight bytes at a time are checked.
std::size_t CountPlainAscii(std::string_view text) noexcept {
  constexpr std::uint64_t HIGH_BITS = 0x8080808080808080;
  constexpr std::uint64_t BLANKS = 0x2020202020202020;
  std::size_t offset = 0;
  for (std::uint64_t word = 0; text.size() - offset >= sizeof word; offset += sizeof word) {
    std::memcpy(&word, text.data() + offset, sizeof word);
    if ((word | (word - BLANKS)) & HIGH_BITS) { // for a control character, the subtraction sets the high bit
      break;
    }
  }
  return offset;
}

} // namespace

bool IsNameStart(std::uint32_t character) noexcept {
  if (character < 0x80) {
    return (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z') || character == '_';
  }
  return IsIn(NAME_START_RANGES, character);
}

bool IsNameCharacter(std::uint32_t character) noexcept {
  if (character < 0x80) {
    return IsNameStart(character) || (character >= '0' && character <= '9') || character == '-' || character == '.';
  }
  return IsIn(NAME_START_RANGES, character) || IsIn(NAME_MORE_RANGES, character);
}

bool IsXmlCharacter(std::uint32_t character) noexcept {
  if (character < 0x20) {
    return character == '\t' || character == '\n' || character == '\r';
  }
  return character <= 0xD7FF || (character >= 0xE000 && character <= 0xFFFD) ||
         (character >= 0x10000 && character <= 0x10FFFF);
}

std::string FormatCharacter(std::uint32_t character) {
  char code[16];
  std::snprintf(code, sizeof code, "U+%04X", static_cast<unsigned>(character));
  return code;
}

char *WriteCharacter(std::uint32_t character, char *target) noexcept {
  const auto put = [&target](std::uint32_t byte) { *target++ = static_cast<char>(byte); };
  const auto putLower = [&put, character](unsigned shift) { put(0x80 | (character >> shift & 0x3F)); };
  if (character < 0x80) {
    put(character);
  } else if (character < 0x800) {
    put(0xC0 | character >> 6);
    putLower(0);
  } else if (character < 0x10000) {
    put(0xE0 | character >> 12);
    putLower(6);
    putLower(0);
  } else {
    put(0xF0 | character >> 18);
    putLower(12);
    putLower(6);
    putLower(0);
  }
  return target;
}

std::uint32_t ReadCharacter(std::string_view text, std::size_t &offset) noexcept {
  const std::uint32_t lead = Byte(text, offset);
  if (lead < 0x80) {
    ++offset;
    return lead;
  }
  const std::size_t length = lead >= 0xF0 ? 4 : lead >= 0xE0 ? 3 : 2;
  if (lead < 0xC2 || lead > 0xF4 || text.size() - offset < length) {
    return NO_CHARACTER;
  }
  std::uint32_t character = lead & (0x7Fu >> length);
  for (std::size_t i = 1; i < length; ++i) {
    const std::uint32_t next = Byte(text, offset + i);
    if ((next & 0xC0) != 0x80) {
      return NO_CHARACTER;
    }
    character = character << 6 | (next & 0x3F);
  }
  const bool overlong = (length == 3 && character < 0x800) || (length == 4 && character < 0x10000);
  const bool surrogate = character >= 0xD800 && character <= 0xDFFF;
  if (overlong || surrogate || character > 0x10FFFF) {
    return NO_CHARACTER;
  }
  offset += length;
  return character;
}

std::size_t FindInvalidUtf8(std::string_view text) noexcept {
  std::size_t offset = 0;
  while (offset < text.size()) {
    const std::size_t ascii = FindNonAscii(text.substr(offset));
    if (ascii == std::string_view::npos) {
      return std::string_view::npos;
    }
    offset += ascii;
    while (offset < text.size() && Byte(text, offset) >= 0x80) {
      if (ReadCharacter(text, offset) == NO_CHARACTER) {
        return offset;
      }
    }
  }
  return std::string_view::npos;
}

std::string DescribeForbiddenCharacter(std::string_view what, std::string_view text) {
  std::size_t offset = CountPlainAscii(text);
  while (offset < text.size()) {
    const std::size_t begin = offset;
    const std::uint32_t character = ReadCharacter(text, offset);
    if (character == NO_CHARACTER) {
      return std::string(what) + " is not UTF-8 at byte " + std::to_string(begin + 1);
    }
    if (!IsXmlCharacter(character)) {
      return std::string(what) + " holds the character " + FormatCharacter(character) + " at byte " +
             std::to_string(begin + 1) + ", which XML 1.0 cannot carry";
    }
  }
  return std::string();
}

bool IsNcName(std::string_view name) noexcept {
  std::size_t offset = 0;
  while (offset < name.size()) {
    if (IS_ASCII_LETTER[Byte(name, offset)]) {
      ++offset;
      continue;
    }
    const bool isFirst = offset == 0;
    const std::uint32_t character = ReadCharacter(name, offset);
    if (character == NO_CHARACTER || !(isFirst ? IsNameStart(character) : IsNameCharacter(character))) {
      return false;
    }
  }
  return !name.empty();
}

} // namespace Tarvel::Xml
