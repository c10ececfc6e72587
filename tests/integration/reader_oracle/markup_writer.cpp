// SPDX-License-Identifier: Apache-2.0

#include "markup_writer.h"

#include "xml_pieces.h"

#include <cstdio>
#include <iterator>

namespace Testing {

namespace {

/// Each text uses one of these numbers: one in so many of its pieces is odd. With 0, no piece is odd.
constexpr std::size_t ODDITIES[] = {0, 0, 0, 150, 60, 25, 8};

std::string Utf8(std::uint32_t c) {
  std::string text;
  if (c < 0x80) {
    text += static_cast<char>(c);
    return text;
  }
  if (c >= 0x10000) {
    text += static_cast<char>(0xF0 | (c >> 18));
    text += static_cast<char>(0x80 | ((c >> 12) & 0x3F));
  } else if (c >= 0x800) {
    text += static_cast<char>(0xE0 | (c >> 12));
  }
  if (c >= 0x800) {
    text += static_cast<char>(0x80 | ((c >> 6) & 0x3F));
  } else {
    text += static_cast<char>(0xC0 | (c >> 6));
  }
  text += static_cast<char>(0x80 | (c & 0x3F));
  return text;
}

} // namespace

MarkupWriter::MarkupWriter(RandomSource &random)
    : m_random(random), m_oddity(ODDITIES[random.Below(std::size(ODDITIES))]), m_isNarrow(random.OnceIn(8)) {}

template <std::size_t COUNT>
void MarkupWriter::PutPieces(const std::string_view (&pieces)[COUNT]) {
  for (std::size_t count = m_random.Below(4); count != 0; --count) {
    Put(m_random.OneOf(pieces));
  }
}

std::string_view MarkupWriter::Space() {
  if (IsOdd()) {
    return m_random.OneOf(NO_SPACES);
  }
  return m_random.OnceIn(4) ? m_random.OneOf(SPACES) : " "sv;
}

void MarkupWriter::PutOptionalSpace() {
  if (m_random.OnceIn(6)) {
    Put(m_random.OneOf(SPACES));
  }
}

template <std::size_t COUNT>
std::uint32_t MarkupWriter::Boundary(const std::uint32_t (&boundaries)[COUNT]) {
  const std::uint32_t boundary = boundaries[m_random.Below(COUNT)];
  return boundary + static_cast<std::uint32_t>(m_random.Below(3)) - (boundary > 0 ? 1 : 0);
}

std::string MarkupWriter::Name() {
  if (m_isNarrow) {
    return std::string(NAMES[m_random.Below(2)]);
  }
  if (IsOdd()) {
    return std::string(m_random.OneOf(ODD_NAMES));
  }
  if (IsOdd() || m_random.OnceIn(40)) {
    const std::string character = Utf8(Boundary(NAME_BOUNDARIES));
    return m_random.OnceIn(2) ? character : std::string(m_random.OneOf(NAMES)) + character + "z";
  }
  return std::string(m_random.OneOf(NAMES));
}

void MarkupWriter::PutCharacter() {
  const std::uint32_t character = Boundary(CHARACTER_BOUNDARIES);
  char reference[32];
  switch (m_random.Below(5)) {
  case 0:
    std::snprintf(reference, sizeof reference, "&#%u;", character);
    return Put(reference);
  case 1:
    std::snprintf(reference, sizeof reference, m_random.OnceIn(2) ? "&#x%X;" : "&#x0%x;", character);
    return Put(reference);
  case 2:
    return Put(m_random.OneOf(INVALID_UTF8));
  default:
    return Put(Utf8(character));
  }
}

void MarkupWriter::PutText() {
  PutPieces(TEXT_PIECES);
  if (IsOdd()) {
    Put(m_random.OneOf(ODD_TEXT_PIECES));
  }
  if (IsOdd() || m_random.OnceIn(30)) {
    PutCharacter();
  }
}

void MarkupWriter::PutInstruction() {
  const std::string target = Name();
  Put("<?" + target);
  if (!m_random.OnceIn(3)) {
    Put(Space());
    PutPieces(DATA_PIECES);
    if (IsOdd()) {
      PutCharacter();
    }
  }
  Put(IsOdd() ? "?" : "?>");
}

void MarkupWriter::PutComment() {
  Put("<!--");
  const std::size_t begin = m_text.size();
  PutPieces(COMMENT_PIECES);
  if (IsOdd()) {
    PutCharacter();
  }
  if (m_oddity == 0 || !m_random.OnceIn(m_oddity)) { // a comment that is not odd must not have two hyphens
    RemoveRuns(begin);
  }
  Put(IsOdd() ? "--" : "-->");
}

void MarkupWriter::RemoveRuns(std::size_t begin) {
  for (std::size_t i = begin; i < m_text.size(); ++i) {
    if (m_text[i] == '-' && (i + 1 == m_text.size() || m_text[i + 1] == '-')) {
      m_text[i] = '+';
    }
  }
}

void MarkupWriter::PutCData() {
  Put("<![CDATA[");
  PutPieces(CDATA_PIECES);
  if (IsOdd()) {
    PutCharacter();
  }
  Put(IsOdd() ? "]]" : "]]>");
}

void MarkupWriter::PutOutside() {
  for (std::size_t count = m_random.OnceIn(2) ? 0 : m_random.Below(4); count != 0; --count) {
    switch (m_random.Below(IsOdd() ? 5 : 3)) {
    case 0:
      Put(m_random.OneOf(SPACES));
      break;
    case 1:
      PutComment();
      break;
    case 2:
      PutInstruction();
      break;
    case 3:
      Put(m_random.OnceIn(2) ? "<!DOCTYPE a>" : "<!DOCTYPE a [<!ENTITY e 'x'>]>");
      break;
    default:
      Put(m_random.OnceIn(2) ? "&#32;" : "<![CDATA[]]>");
    }
  }
}

void MarkupWriter::PutDeclaration() {
  const bool isOdd = IsOdd() || m_random.OnceIn(4);
  Put(isOdd && m_random.OnceIn(12) ? "<?XML" : "<?xml");
  Put(isOdd && m_random.OnceIn(2) ? m_random.OneOf(VERSIONS) : VERSIONS[m_random.Below(4)]);
  Put(isOdd ? m_random.OneOf(ENCODINGS) : ENCODINGS[m_random.Below(6)]);
  Put(isOdd && m_random.OnceIn(2) ? m_random.OneOf(STANDALONES) : STANDALONES[m_random.Below(4)]);
  Put(isOdd && m_random.OnceIn(2) ? m_random.OneOf(DECLARATION_ENDS) : DECLARATION_ENDS[m_random.Below(3)]);
}

void MarkupWriter::PutValue(std::string_view value) {
  const char quote = value.find('"') == std::string_view::npos && m_random.OnceIn(2) ? '"' : '\'';
  m_text += quote;
  for (const char character : value) {
    if (character != quote) {
      m_text += character;
    }
  }
  m_text += IsOdd() ? '"' : quote;
}

std::string MarkupWriter::AttributeValue() {
  const std::size_t begin = m_text.size();
  PutText();
  std::string value = m_text.substr(begin);
  m_text.resize(begin);
  return value;
}

void MarkupWriter::PutAttribute(const std::string &name, std::string_view value) {
  Put(Space());
  Put(name);
  PutOptionalSpace();
  Put(IsOdd() ? "" : "=");
  PutOptionalSpace();
  PutValue(value);
}

} // namespace Testing
