// SPDX-License-Identifier: Apache-2.0

#include "xml/source_cursor.h"

#include "core/ascii_case.h"
#include "xml/characters.h"

#include <tarvel/xml/parser.h>

namespace Tarvel::Xml {

void SourceCursor::SkipUncommonCharacter() {
  std::size_t offset = GetOffset(m_next);
  const std::size_t begin = offset;
  const std::uint32_t character = ReadCharacter(m_source, offset);
  if (character == NO_CHARACTER) {
    Refuse(Refusal::NOT_UTF8, m_next);
  }
  if (character == 0) {
    Refuse(Refusal::NULL_BYTE, m_next);
  }
  if (character >= 0x80 && m_isAscii) {
    Refuse(Refusal::NOT_US_ASCII, m_next);
  }
  if (!IsXmlCharacter(character)) {
    Refuse(Refusal::FORBIDDEN_CHARACTER, m_next, FormatCharacter(character));
  }
  m_next += offset - begin;
}

bool SourceCursor::SkipNonAsciiNameCharacter(bool (*isAccepted)(std::uint32_t)) {
  if (IsAtEnd() || static_cast<unsigned char>(*m_next) < 0x80) {
    return false;
  }
  std::size_t offset = GetOffset(m_next);
  const std::uint32_t character = ReadCharacter(m_source, offset);
  if (character == NO_CHARACTER || m_isAscii || !isAccepted(character)) {
    return false; // whatever the byte is, it ends the name
  }
  m_next = m_source.data() + offset;
  return true;
}

bool SourceCursor::SkipNameBeyondAscii() {
  return SkipNonAsciiNameCharacter(&IsNameStart) && SkipRestOfName();
}

bool SourceCursor::SkipRestOfName() {
  do {
    SkipNameCharacters();
  } while (SkipNonAsciiNameCharacter(&IsNameCharacter));
  return true;
}

WrittenName SourceCursor::ReadName(Refusal atEnd) {
  const char *const begin = m_next;
  WrittenName name;
  const bool hasFirst = SkipNcName();
  if (IsAt(':')) {
    if (!hasFirst) {
      Refuse(Refusal::NOT_QUALIFIED_NAME, m_next);
    }
    name.prefixLength = static_cast<std::size_t>(m_next - begin);
    ++m_next;
    if (!SkipNcName() || IsAt(':')) {
      RefuseNext(Refusal::NOT_QUALIFIED_NAME, atEnd);
    }
  }
  name.text = GetFrom(begin);
  if (name.text.size() > MAX_NAME_BYTES) {
    Refuse(Refusal::NAME_TOO_LONG, begin);
  }
  return name;
}

// A target "xml" in lower case is an XML declaration that is too late; in other letter cases the name is reserved.
std::string_view SourceCursor::ReadTarget() {
  const char *const begin = m_next;
  Advance(INSTRUCTION_BEGIN.size());
  const char *const nameBegin = m_next;
  const bool hasName = SkipNcName();
  if (IsAt(':')) {
    Refuse(Refusal::COLON_IN_TARGET, m_next);
  }
  if (!hasName || IsAtEnd()) {
    RefuseNext(Refusal::NO_TARGET, Refusal::ENDS_IN_INSTRUCTION);
  }
  const std::string_view target = GetFrom(nameBegin);
  if (target.size() > MAX_NAME_BYTES) {
    Refuse(Refusal::NAME_TOO_LONG, nameBegin);
  }
  if (target == "xml") {
    Refuse(Refusal::LATE_DECLARATION, begin);
  }
  if (EqualsIgnoringCase(target, "xml")) {
    Refuse(Refusal::RESERVED_TARGET, nameBegin, target);
  }
  return target;
}

void SourceCursor::RefuseNext(Refusal refusal, Refusal atEnd, std::string_view found) {
  if (IsAtEnd()) {
    Refuse(atEnd, m_next, found);
  }
  const char *const place = m_next;
  SkipCharacter();
  Refuse(refusal, place, found);
}

void SourceCursor::Refuse(Refusal refusal, const char *place, std::string_view found,
                          std::string_view alsoFound) const {
  Xml::Refuse(refusal, m_source, GetOffset(place), found, alsoFound);
}

} // namespace Tarvel::Xml
