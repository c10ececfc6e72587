// SPDX-License-Identifier: Apache-2.0

#include "xml/document_beginning.h"

#include "core/ascii_case.h"

#include <tarvel/xml/parser.h>

#include <optional>
#include <string_view>

namespace Tarvel::Xml {

namespace {

constexpr std::string_view DECLARATION_BEGIN = "<?xml";
constexpr std::size_t FIRST_BYTES = 4; // enough to distinguish the encodings of Unicode (XML 1.0, appendix F)

/// Reads the parts of an XML declaration (XML 1.0, section 2.8), which have a fixed order.
class DeclarationReader {
public:
  explicit DeclarationReader(SourceCursor &cursor) : m_cursor(cursor) { m_cursor.Advance(DECLARATION_BEGIN.size()); }

  /// The value of the part `name`, or nullopt if another part or the end comes next.
  std::optional<std::string_view> Read(std::string_view name) {
    m_isAfterSpace = m_cursor.SkipSpace() || m_isAfterSpace;
    if (!m_isAfterSpace || !m_cursor.Skip(name)) {
      return std::nullopt;
    }
    m_isAfterSpace = false;
    m_cursor.SkipSpace();
    Require("=");
    m_cursor.SkipSpace();
    const std::string_view quote = m_cursor.IsAt('\'') ? "'" : "\"";
    Require(quote);
    const char *const begin = m_cursor.GetPlace();
    m_cursor.SkipPlain<PLAIN_IN_VALUE>();
    const std::string_view value = m_cursor.GetFrom(begin);
    Require(quote);
    return value;
  }

  void Require(std::string_view literal) {
    if (!m_cursor.Skip(literal)) {
      m_cursor.RefuseNext(Refusal::MALFORMED_DECLARATION, Refusal::ENDS_IN_DECLARATION);
    }
  }

  void End() {
    m_cursor.SkipSpace();
    Require("?>");
  }

private:
  SourceCursor &m_cursor;
  bool m_isAfterSpace = false;
};

void ApplyEncoding(SourceCursor &cursor, std::string_view encoding) {
  if (EqualsIgnoringCase(encoding, "US-ASCII")) {
    cursor.RequireAscii();
  } else if (!EqualsIgnoringCase(encoding, "UTF-8")) {
    cursor.Refuse(Refusal::OTHER_ENCODING_DECLARED, encoding.data(), encoding);
  }
}

void ReadDeclaration(SourceCursor &cursor) {
  DeclarationReader declaration(cursor);
  const std::optional<std::string_view> version = declaration.Read("version");
  if (!version) {
    cursor.RefuseNext(Refusal::MALFORMED_DECLARATION, Refusal::ENDS_IN_DECLARATION);
  }
  if (*version != "1.0") {
    cursor.Refuse(Refusal::OTHER_VERSION, version->data(), *version);
  }
  if (const std::optional<std::string_view> encoding = declaration.Read("encoding")) {
    ApplyEncoding(cursor, *encoding);
  }
  const std::optional<std::string_view> standalone = declaration.Read("standalone");
  if (standalone && *standalone != "yes" && *standalone != "no") {
    cursor.Refuse(Refusal::NEITHER_YES_NOR_NO, standalone->data(), *standalone);
  }
  declaration.End();
}

/// Whether a target that begins with "xml" continues in `rest`: "<?xml-stylesheet" begins an instruction, not a declaration.
bool ContinuesTarget(std::string_view rest) noexcept {
  return !rest.empty() &&
         (IsOfClass(rest.front(), NAME) || rest.front() == ':' || static_cast<unsigned char>(rest.front()) >= 0x80);
}

void CheckFirstBytes(const SourceCursor &cursor) {
  using namespace std::string_view_literals;
  const std::string_view source = cursor.GetSource();
  for (const std::string_view mark : {"\xFF\xFE"sv, "\xFE\xFF"sv, "\0\0\xFE\xFF"sv}) {
    if (cursor.IsAt(mark)) {
      cursor.Refuse(Refusal::OTHER_UNICODE_ENCODING, source.data());
    }
  }
  const std::size_t null = source.substr(0, FIRST_BYTES).find('\0');
  if (null != std::string_view::npos) {
    cursor.Refuse(Refusal::BEGINS_WITH_NULL, source.data() + null);
  }
}

} // namespace

void ReadDocumentBeginning(SourceCursor &cursor) {
  const std::string_view source = cursor.GetSource();
  if (source.size() > MAX_DOCUMENT_BYTES) {
    cursor.Refuse(Refusal::DOCUMENT_TOO_LONG, source.data() + MAX_DOCUMENT_BYTES);
  }
  CheckFirstBytes(cursor);
  const std::size_t markLength = GetByteOrderMarkLength(source);
  cursor.Advance(markLength);
  if (markLength > 0 && GetByteOrderMarkLength(source.substr(markLength)) > 0) {
    cursor.Refuse(Refusal::TWO_BYTE_ORDER_MARKS, cursor.GetPlace());
  }
  if (cursor.IsAtEnd()) {
    cursor.Refuse(Refusal::EMPTY_DOCUMENT, cursor.GetPlace());
  }
  if (cursor.IsAt(DECLARATION_BEGIN) && !ContinuesTarget(source.substr(markLength + DECLARATION_BEGIN.size()))) {
    ReadDeclaration(cursor);
  }
}

} // namespace Tarvel::Xml
