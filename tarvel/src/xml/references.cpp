// SPDX-License-Identifier: Apache-2.0

#include "xml/references.h"

#include "xml/characters.h"

#include <algorithm>
#include <cstdint>
#include <iterator>
#include <string_view>

namespace Tarvel::Xml {

namespace {

struct Entity {
  std::string_view name;
  char character;
};

/// XML 1.0, section 4.6.
constexpr Entity ENTITIES[] = {{"amp", '&'}, {"lt", '<'}, {"gt", '>'}, {"quot", '"'}, {"apos", '\''}};

constexpr std::uint32_t NO_DIGIT = 16;

std::uint32_t GetDigit(char c) noexcept {
  if (c >= '0' && c <= '9') {
    return static_cast<std::uint32_t>(c - '0');
  }
  const char lower = static_cast<char>(c | 0x20);
  return lower >= 'a' && lower <= 'f' ? static_cast<std::uint32_t>(lower - 'a') + 10 : NO_DIGIT;
}

/// Reads digits. A number that is too large for a character stays too large, however many digits follow.
std::uint32_t ReadNumber(SourceCursor &cursor, std::uint32_t base) {
  constexpr std::uint32_t NO_CHARACTERS_FROM = 0x110000;
  if (cursor.IsAtEnd() || GetDigit(cursor.Peek()) >= base) {
    cursor.RefuseNext(Refusal::NO_DIGITS_IN_REFERENCE, Refusal::ENDS_IN_REFERENCE);
  }
  std::uint32_t number = 0;
  for (; !cursor.IsAtEnd() && GetDigit(cursor.Peek()) < base; cursor.Advance(1)) {
    number = std::min(number * base + GetDigit(cursor.Peek()), NO_CHARACTERS_FROM);
  }
  return number;
}

void RequireSemicolon(SourceCursor &cursor) {
  if (!cursor.Skip(";")) {
    cursor.RefuseNext(Refusal::NO_SEMICOLON, Refusal::ENDS_IN_REFERENCE);
  }
}

} // namespace

std::size_t ReadReference(SourceCursor &cursor, char (&replacement)[4]) {
  const char *const begin = cursor.GetPlace();
  cursor.Advance(1);
  if (cursor.Skip("#")) {
    const std::uint32_t base = cursor.Skip("x") ? 16 : 10;
    const std::uint32_t character = ReadNumber(cursor, base);
    RequireSemicolon(cursor);
    if (!IsXmlCharacter(character)) {
      cursor.Refuse(Refusal::FORBIDDEN_REFERENCE, begin, cursor.GetFrom(begin));
    }
    return static_cast<std::size_t>(WriteCharacter(character, replacement) - replacement);
  }
  const char *const nameBegin = cursor.GetPlace();
  if (!cursor.SkipNcName()) {
    cursor.RefuseNext(Refusal::NO_REFERENCE, Refusal::ENDS_IN_REFERENCE);
  }
  const std::string_view name = cursor.GetFrom(nameBegin);
  RequireSemicolon(cursor);
  const auto entity = std::find_if(std::begin(ENTITIES), std::end(ENTITIES),
                                   [name](const Entity &candidate) { return candidate.name == name; });
  if (entity == std::end(ENTITIES)) {
    cursor.Refuse(Refusal::UNKNOWN_ENTITY, begin, name);
  }
  replacement[0] = entity->character;
  return 1;
}

} // namespace Tarvel::Xml
