// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <array>

namespace Tarvel {

namespace {

constexpr std::string_view ALPHABET = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
constexpr char PAD = '=';

/// The values of characters outside the alphabet. Each has a bit that no six-bit value has.
constexpr std::uint8_t OTHER = 0x80;
constexpr std::uint8_t BLANK = 0x40;

constexpr std::array<std::uint8_t, 256> MakeValues() {
  std::array<std::uint8_t, 256> values{};
  for (std::uint8_t &value : values) {
    value = OTHER;
  }
  for (std::size_t i = 0; i < ALPHABET.size(); ++i) {
    values[static_cast<unsigned char>(ALPHABET[i])] = static_cast<std::uint8_t>(i);
  }
  for (const char blank : {'\t', '\n', '\r', ' '}) {
    values[static_cast<unsigned char>(blank)] = BLANK;
  }
  return values;
}

constexpr std::array<std::uint8_t, 256> VALUES = MakeValues();

std::uint32_t ValueOf(char c) noexcept {
  return VALUES[static_cast<unsigned char>(c)];
}

[[noreturn]] void Refuse(const char *reason, std::size_t position) {
  throw Base64FormatException("Base64 text: " + std::string(reason) + " at character " + std::to_string(position + 1));
}

/// Decodes groups of four characters of the alphabet, up to the first other character; returns the number of characters
/// used.
std::size_t DecodeFullGroups(std::string_view text, std::uint8_t *&out) noexcept {
  std::size_t used = 0;
  while (text.size() - used >= 4) {
    const std::uint32_t a = ValueOf(text[used]);
    const std::uint32_t b = ValueOf(text[used + 1]);
    const std::uint32_t c = ValueOf(text[used + 2]);
    const std::uint32_t d = ValueOf(text[used + 3]);
    if ((a | b | c | d) > 0x3F) {
      break;
    }
    *out++ = static_cast<std::uint8_t>(a << 2 | b >> 4);
    *out++ = static_cast<std::uint8_t>((b & 0x0F) << 4 | c >> 2);
    *out++ = static_cast<std::uint8_t>((c & 0x03) << 6 | d);
    used += 4;
  }
  return used;
}

/// Checks the text from its first pad to its end: it must have exactly the pads that a last group of `characters`
/// needs, and may have blanks between and after them, but nothing else.
void RequirePadding(std::string_view text, std::size_t position, int characters) {
  if (characters < 2) {
    Refuse("misplaced padding", position);
  }
  int missing = 4 - characters;
  for (; position < text.size(); ++position) {
    if (text[position] == PAD && missing > 0) {
      --missing;
    } else if (ValueOf(text[position]) != BLANK) {
      Refuse("character after the padding", position);
    }
  }
  if (missing > 0) {
    Refuse("padding cut short", position);
  }
}

/// The characters that have been read of an incomplete group of four: blanks or the padding interrupt it.
struct PartialGroup {
  std::uint32_t bits = 0;
  int characters = 0;

  /// Adds the value of one character. The fourth one writes the bytes of the group and starts the next.
  void Add(std::uint32_t value, std::uint8_t *&out) noexcept {
    bits = bits << 6 | value;
    if (++characters == 4) {
      *out++ = static_cast<std::uint8_t>(bits >> 16);
      *out++ = static_cast<std::uint8_t>(bits >> 8);
      *out++ = static_cast<std::uint8_t>(bits);
      *this = PartialGroup();
    }
  }
};

/// Writes the bytes of a last group of two or three characters, whose values are `bits`.
void DecodeLastGroup(std::uint32_t bits, int characters, std::size_t position, std::uint8_t *&out) {
  const int unused = characters == 2 ? 4 : 2;
  if ((bits & ((1U << unused) - 1)) != 0) {
    Refuse("padding bits that are not zero", position);
  }
  bits >>= unused;
  if (characters == 3) {
    *out++ = static_cast<std::uint8_t>(bits >> 8);
  }
  *out++ = static_cast<std::uint8_t>(bits);
}

} // namespace

std::size_t Base64_EncodedLength(std::size_t length) {
  return (length / 3 + (length % 3 != 0 ? 1 : 0)) * 4;
}

std::size_t Base64_Encode(const std::uint8_t *data, std::size_t length, char *out) {
  const char *const start = out;
  std::size_t i = 0;
  for (; length - i >= 3; i += 3) {
    const std::uint32_t bits = std::uint32_t{data[i]} << 16 | std::uint32_t{data[i + 1]} << 8 | data[i + 2];
    *out++ = ALPHABET[bits >> 18];
    *out++ = ALPHABET[bits >> 12 & 0x3F];
    *out++ = ALPHABET[bits >> 6 & 0x3F];
    *out++ = ALPHABET[bits & 0x3F];
  }
  if (i < length) {
    const bool two = length - i == 2;
    const std::uint32_t bits = std::uint32_t{data[i]} << 16 | (two ? std::uint32_t{data[i + 1]} << 8 : 0U);
    *out++ = ALPHABET[bits >> 18];
    *out++ = ALPHABET[bits >> 12 & 0x3F];
    *out++ = two ? ALPHABET[bits >> 6 & 0x3F] : PAD;
    *out++ = PAD;
  }
  return static_cast<std::size_t>(out - start);
}

std::string StringUtil::Base64Encode(const std::uint8_t *data, std::size_t length) {
  std::string text(Base64_EncodedLength(length), '\0');
  Base64_Encode(data, length, text.data());
  return text;
}

std::string StringUtil::Base64Encode(const std::vector<std::uint8_t> &data) {
  return Base64Encode(data.data(), data.size());
}

std::vector<std::uint8_t> StringUtil::Base64Decode(std::string_view text) {
  std::vector<std::uint8_t> bytes(text.size() / 4 * 3);
  std::uint8_t *out = bytes.data();
  PartialGroup group;
  std::size_t position = 0;
  while (position < text.size()) {
    if (group.characters == 0) {
      position += DecodeFullGroups(text.substr(position), out);
      if (position == text.size()) {
        break;
      }
    }
    const char c = text[position];
    if (c == PAD) {
      RequirePadding(text, position, group.characters);
      DecodeLastGroup(group.bits, group.characters, position, out);
      group.characters = 0;
      break;
    }
    const std::uint32_t value = ValueOf(c);
    if (value == OTHER) {
      Refuse("character outside the alphabet", position);
    }
    ++position;
    if (value != BLANK) {
      group.Add(value, out);
    }
  }
  if (group.characters != 0) {
    Refuse("a last group without its padding", position);
  }
  bytes.resize(static_cast<std::size_t>(out - bytes.data()));
  return bytes;
}

} // namespace Tarvel
