// SPDX-License-Identifier: Apache-2.0

#include "support/printable_text.h"

#include <algorithm>
#include <cstddef>

namespace Testing {

namespace {

struct Range {
  std::string_view first;
  std::string_view last;
};

/// UTF-8 sequences sort like their characters.
constexpr Range NOT_PRINTABLE[] = {
    {"\xC2\x80", "\xC2\x9F"},         // C1 controls
    {"\xD8\x9C", "\xD8\x9C"},         // Arabic letter mark
    {"\xE2\x80\x8E", "\xE2\x80\x8F"}, // left-to-right and right-to-left mark
    {"\xE2\x80\xA8", "\xE2\x80\xAE"}, // line and paragraph separator, embeddings and overrides
    {"\xE2\x81\xA6", "\xE2\x81\xA9"}, // isolates
};

/// The length of the UTF-8 sequence at the start of `text`; 1 if there is no complete one.
std::size_t SequenceLength(std::string_view text) {
  const std::size_t continuations =
      std::min(text.find_first_not_of("\x80\x81\x82\x83\x84\x85\x86\x87\x88\x89\x8A\x8B\x8C\x8D\x8E\x8F"
                                      "\x90\x91\x92\x93\x94\x95\x96\x97\x98\x99\x9A\x9B\x9C\x9D\x9E\x9F"
                                      "\xA0\xA1\xA2\xA3\xA4\xA5\xA6\xA7\xA8\xA9\xAA\xAB\xAC\xAD\xAE\xAF"
                                      "\xB0\xB1\xB2\xB3\xB4\xB5\xB6\xB7\xB8\xB9\xBA\xBB\xBC\xBD\xBE\xBF",
                                      1),
               text.size()) -
      1;
  const auto lead = static_cast<unsigned char>(text.front());
  const std::size_t announced = lead >= 0xF0 ? 3 : lead >= 0xE0 ? 2 : lead >= 0xC2 ? 1 : 0;
  return announced <= continuations ? announced + 1 : 1;
}

bool IsPrintableCharacter(std::string_view character) {
  const auto octet = static_cast<unsigned char>(character.front());
  if (character.size() == 1) {
    // A terminal may read an octet that is not part of a sequence as a C1 control.
    return octet >= 0x20 && octet != 0x7F && (octet < 0x80 || octet > 0x9F);
  }
  return std::none_of(std::begin(NOT_PRINTABLE), std::end(NOT_PRINTABLE), [character](const Range &range) {
    return character.size() == range.first.size() && range.first <= character && character <= range.last;
  });
}

} // namespace

bool IsPrintable(std::string_view text) {
  while (!text.empty()) {
    const std::size_t length = SequenceLength(text);
    if (!IsPrintableCharacter(text.substr(0, length))) {
      return false;
    }
    text.remove_prefix(length);
  }
  return true;
}

} // namespace Testing
