// SPDX-License-Identifier: Apache-2.0

#include "xml/source_checks.h"

#include "xml/characters.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/parser.h>

#include <algorithm>
#include <cstring>
#include <string>
#include <strings.h>

namespace Tarvel {
namespace Xml {

namespace {

constexpr std::size_t NPOS = std::string_view::npos;
constexpr std::string_view UTF8_MARK = "\xEF\xBB\xBF";
constexpr std::string_view XML_SPACE = " \t\r\n";

// The shortest attribute, with the space before it: ` a=""`.
constexpr std::size_t SHORTEST_ATTRIBUTE_BYTES = 5;
constexpr std::size_t SHORTEST_REFUSED_TAG_BYTES = (MAX_ATTRIBUTES + 1) * SHORTEST_ATTRIBUTE_BYTES;

[[noreturn]] void Refuse(const std::string &detail, std::string_view source, std::size_t offset) {
  const SourcePosition position = GetPosition(source, offset);
  throw XMLParseException(detail, position.line, position.column);
}

bool StartsWith(std::string_view text, std::string_view beginning) noexcept {
  return text.substr(0, beginning.size()) == beginning;
}

void CheckEncoding(std::string_view source) {
  using namespace std::string_view_literals;
  for (const std::string_view mark : {"\xFF\xFE"sv, "\xFE\xFF"sv, "\0\0\xFE\xFF"sv}) {
    if (StartsWith(source, mark)) {
      Refuse("the document is UTF-16 or UTF-32, only UTF-8 is accepted", source, 0);
    }
  }
  const std::size_t null = source.find('\0');
  if (null < 4) {
    Refuse("the document is UTF-16 or UTF-32, or begins with a null byte; only UTF-8 is accepted", source, null);
  }
  if (null != NPOS) {
    Refuse("the document holds a null byte", source, null);
  }
  const std::size_t invalid = FindInvalidUtf8(source);
  if (invalid != NPOS) {
    Refuse("the document is not UTF-8", source, invalid);
  }
}

bool EqualsIgnoringCase(std::string_view text, std::string_view other) noexcept {
  return text.size() == other.size() && strncasecmp(text.data(), other.data(), text.size()) == 0;
}

/// A reader of `name = "value"` pairs, as in an XML declaration and in a start tag.
class PairReader {
public:
  PairReader(std::string_view source, std::size_t offset, std::size_t end) noexcept
      : m_source(source), m_offset(offset), m_end(end) {}

  std::string_view name;
  std::string_view value;

  /// Moves to the next pair. @return whether there is one.
  bool Next() noexcept {
    SkipSpace();
    const std::size_t nameBegin = m_offset;
    m_offset = std::min(m_source.find_first_of(" \t\r\n=?>", m_offset), m_end);
    name = m_source.substr(nameBegin, m_offset - nameBegin);
    SkipSpace();
    if (m_offset >= m_end || m_source[m_offset] != '=') {
      return false;
    }
    ++m_offset;
    SkipSpace();
    if (m_offset >= m_end || (m_source[m_offset] != '"' && m_source[m_offset] != '\'')) {
      return false;
    }
    const std::size_t close = m_source.find(m_source[m_offset], m_offset + 1);
    if (close >= m_end) {
      return false;
    }
    value = m_source.substr(m_offset + 1, close - m_offset - 1);
    m_offset = close + 1;
    return true;
  }

private:
  void SkipSpace() noexcept { m_offset = std::min(m_source.find_first_not_of(XML_SPACE, m_offset), m_end); }

  std::string_view m_source;
  std::size_t m_offset;
  std::size_t m_end;
};

/// What the declaration says of version and encoding. Whether it is well-formed at all is for the parser to judge.
void CheckDeclaration(std::string_view source) {
  constexpr std::string_view BEGINNING = "<?xml";
  const std::size_t begin = GetByteOrderMarkLength(source);
  const std::size_t pairs = begin + BEGINNING.size();
  if (!StartsWith(source.substr(begin), BEGINNING) || pairs >= source.size() || XML_SPACE.find(source[pairs]) == NPOS) {
    return;
  }
  PairReader pair(source, pairs, std::min(source.find("?>", pairs), source.size()));
  while (pair.Next()) {
    const std::size_t offset = static_cast<std::size_t>(pair.value.data() - source.data());
    if (pair.name == "version" && pair.value != "1.0") {
      Refuse("the XML version '" + StringUtil::Shorten(pair.value) + "' is not 1.0", source, offset);
    }
    if (pair.name != "encoding" || EqualsIgnoringCase(pair.value, "UTF-8")) {
      continue;
    }
    if (!EqualsIgnoringCase(pair.value, "US-ASCII")) {
      Refuse("the encoding '" + StringUtil::Shorten(pair.value) + "' is declared, only UTF-8 is accepted", source,
             offset);
    }
    const std::size_t nonAscii = FindNonAscii(source.substr(begin));
    if (nonAscii != NPOS) {
      Refuse("the document is declared as US-ASCII and is not", source, begin + nonAscii);
    }
  }
}

/// How many quoted values stand between the "<" at `offset` and the next "<" or ">" that is not quoted; at most one more
/// than a start tag may have. Never looks behind the next "<".
std::size_t CountQuotedValues(std::string_view source, std::size_t offset) noexcept {
  const std::string_view tag = source.substr(offset, source.find('<', offset + 1) - offset);
  std::size_t count = 0;
  std::size_t next = tag.find_first_of("\"'>");
  while (count <= MAX_ATTRIBUTES && next != NPOS && tag[next] != '>') {
    const std::size_t close = tag.find(tag[next], next + 1);
    if (close == NPOS) {
      break;
    }
    ++count;
    next = tag.find_first_of("\"'>", close + 1);
  }
  return count;
}

/// The offset behind the comment, CDATA section or processing instruction at `offset`; `offset` itself when there is none.
/// One that is not closed reaches to the end.
std::size_t SkipOpaqueMarkup(std::string_view source, std::size_t offset) noexcept {
  struct Delimiters {
    std::string_view begin;
    std::string_view end;
  };
  constexpr Delimiters OPAQUE[] = {{"<!--", "-->"}, {"<![CDATA[", "]]>"}, {"<?", "?>"}};
  for (const Delimiters &delimiters : OPAQUE) {
    if (StartsWith(source.substr(offset), delimiters.begin)) {
      const std::size_t end = source.find(delimiters.end, offset + delimiters.begin.size());
      return end == NPOS ? source.size() : end + delimiters.end.size();
    }
  }
  return offset;
}

/// Whether some "<" begins what would be a start tag with too many attributes, were it not in a comment or the like. Looks
/// only at those that have no other "<" behind them for as long as such a tag must be, and so at few bytes of most texts.
bool MayHaveTooManyAttributes(std::string_view source) noexcept {
  std::size_t opening = source.find('<');
  while (opening != NPOS && source.size() - opening > SHORTEST_REFUSED_TAG_BYTES) {
    const void *const last = memrchr(source.data() + opening + 1, '<', SHORTEST_REFUSED_TAG_BYTES);
    if (last) {
      opening = static_cast<std::size_t>(static_cast<const char *>(last) - source.data());
      continue;
    }
    if (CountQuotedValues(source, opening) > MAX_ATTRIBUTES) {
      return true;
    }
    opening = source.find('<', opening + SHORTEST_REFUSED_TAG_BYTES);
  }
  return false;
}

/// The parser compares each attribute of a start tag with each other, so that their number must be bounded beforehand. A
/// "<" cannot stand in an attribute value: each one begins markup.
void CheckAttributeCounts(std::string_view source) {
  if (!MayHaveTooManyAttributes(source)) {
    return;
  }
  std::size_t offset = source.find('<');
  while (offset != NPOS) {
    const std::size_t behind = SkipOpaqueMarkup(source, offset);
    if (behind == offset && CountQuotedValues(source, offset) > MAX_ATTRIBUTES) {
      Refuse("an element has more than " + std::to_string(MAX_ATTRIBUTES) + " attributes", source, offset);
    }
    offset = source.find('<', std::max(behind, offset + 1));
  }
}

} // namespace

SourcePosition GetPosition(std::string_view source, std::size_t offset) noexcept {
  const std::string_view before = source.substr(0, offset);
  const std::size_t lastBreak = before.rfind('\n');
  const std::size_t lineBegin = lastBreak == NPOS ? std::min(GetByteOrderMarkLength(source), offset) : lastBreak + 1;
  return {static_cast<std::uint32_t>(1 + std::count(before.begin(), before.end(), '\n')),
          static_cast<std::uint32_t>(1 + offset - lineBegin)};
}

std::size_t GetByteOrderMarkLength(std::string_view source) noexcept {
  return StartsWith(source, UTF8_MARK) ? UTF8_MARK.size() : 0;
}

void CheckSource(std::string_view source) {
  if (source.size() > MAX_DOCUMENT_BYTES) {
    Refuse("the document is longer than " + std::to_string(MAX_DOCUMENT_BYTES) + " bytes", source, MAX_DOCUMENT_BYTES);
  }
  // libxml2 would pass over a second mark, though XML has no place for one.
  const std::size_t markLength = GetByteOrderMarkLength(source);
  if (markLength > 0 && GetByteOrderMarkLength(source.substr(markLength)) > 0) {
    Refuse("the document begins with two byte order marks", source, markLength);
  }
  CheckEncoding(source);
  CheckDeclaration(source);
  CheckAttributeCounts(source);
}

} // namespace Xml
} // namespace Tarvel
