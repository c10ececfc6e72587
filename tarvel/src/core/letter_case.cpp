// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/string_util.h>

#include "core/ascii_case.h"
#include "core/fork_gate.h"

#include <algorithm>
#include <clocale>
#include <cwctype>
#include <locale.h>
#include <mutex>

namespace Tarvel {

namespace {

using WideMapping = wint_t (*)(wint_t, locale_t);

constexpr wint_t LAST_CODE_POINT = 0x10FFFF;

/// The Unicode locale of the C library, whatever locale the host process has chosen. Null when this system does not
/// have it. It is never freed.
locale_t UnicodeLocale() {
  const Computation computing; // the C library takes a lock
  static std::once_flag once;
  static locale_t locale = nullptr;
  std::call_once(once, [] { locale = ::newlocale(LC_CTYPE_MASK, "C.UTF-8", nullptr); });
  return locale;
}

bool IsAscii(char c) noexcept {
  return static_cast<unsigned char>(c) < 0x80;
}

char UpperAscii(char c) noexcept {
  return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c;
}

char LowerAscii(char c) noexcept {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

struct CodePoint {
  wint_t value;
  std::size_t length; ///< its bytes in UTF-8; 0 when the text is not UTF-8 there
};

/// The character at the start of `text`. Only the well-formed byte sequences of RFC 3629 are accepted, without overlong
/// forms and surrogates.
CodePoint DecodeUtf8(std::string_view text) noexcept {
  constexpr CodePoint MALFORMED{0, 0};
  const auto byte = [text](std::size_t index) { return static_cast<unsigned char>(text[index]); };
  const unsigned lead = byte(0);
  const std::size_t length = lead >= 0xC2 && lead < 0xE0   ? 2
                             : lead >= 0xE0 && lead < 0xF0 ? 3
                             : lead >= 0xF0 && lead < 0xF5 ? 4
                                                           : 0;
  if (length == 0 || text.size() < length) {
    return MALFORMED;
  }
  wint_t value = lead & (0x7FU >> length);
  for (std::size_t i = 1; i < length; ++i) {
    if ((byte(i) & 0xC0U) != 0x80U) {
      return MALFORMED;
    }
    value = value << 6 | (byte(i) & 0x3FU);
  }
  const bool overlong = (length == 3 && value < 0x800) || (length == 4 && value < 0x10000);
  const bool surrogate = value >= 0xD800 && value <= 0xDFFF;
  return overlong || surrogate || value > LAST_CODE_POINT ? MALFORMED : CodePoint{value, length};
}

void AppendUtf8(std::string &text, wint_t value) {
  if (value < 0x80) {
    text += static_cast<char>(value);
    return;
  }
  const int continuations = value < 0x800 ? 1 : value < 0x10000 ? 2 : 3;
  const unsigned lead = (0xF00U >> (continuations + 1)) & 0xFFU;
  text += static_cast<char>(lead | value >> (6 * continuations));
  for (int i = continuations - 1; i >= 0; --i) {
    text += static_cast<char>(0x80U | ((value >> (6 * i)) & 0x3FU));
  }
}

std::string MapCase(std::string_view text, char (*mapAscii)(char), WideMapping mapWide) {
  std::string result(text);
  std::transform(text.begin(), text.end(), result.begin(), mapAscii);
  const locale_t locale = std::all_of(text.begin(), text.end(), IsAscii) ? nullptr : UnicodeLocale();
  if (!locale) {
    return result;
  }
  result.clear();
  for (std::size_t i = 0; i < text.size();) {
    const CodePoint character = IsAscii(text[i]) ? CodePoint{0, 0} : DecodeUtf8(text.substr(i));
    if (character.length == 0) {
      result += mapAscii(text[i++]);
      continue;
    }
    AppendUtf8(result, mapWide(character.value, locale));
    i += character.length;
  }
  return result;
}

} // namespace

std::string StringUtil::ToUpper(std::string_view text) {
  return MapCase(text, UpperAscii, ::towupper_l);
}

std::string StringUtil::ToLower(std::string_view text) {
  return MapCase(text, LowerAscii, ::towlower_l);
}

bool EqualsIgnoringCase(std::string_view left, std::string_view right) noexcept {
  return std::equal(left.begin(), left.end(), right.begin(), right.end(),
                    [](char a, char b) { return LowerAscii(a) == LowerAscii(b); });
}

} // namespace Tarvel
