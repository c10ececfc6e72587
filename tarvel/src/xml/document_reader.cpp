// SPDX-License-Identifier: Apache-2.0

#include "xml/document_reader.h"

#include "xml/document_beginning.h"
#include "xml/namespace_scope.h"
#include "xml/references.h"
#include "xml/source_cursor.h"
#include "xml/text_gatherer.h"

#include <string>
#include <vector>

namespace Tarvel::Xml {

namespace {

constexpr std::string_view COMMENT_BEGIN = "<!--";
constexpr std::string_view CDATA_BEGIN = "<![CDATA[";
constexpr std::string_view CDATA_END = "]]>";
constexpr std::string_view INSTRUCTION_END = "?>";

class DocumentReader {
public:
  DocumentReader(std::string_view source, XMLHandler &handler);

  void Run();

private:
  struct OpenElement {
    std::string_view name;
    std::uint32_t line;
    std::size_t declarations;
  };

  void ReadOutside();
  void ReadMarkup();
  void ReadStartTag();
  void ReadAttributes(const char *tag);
  void ReadAttribute(const char *tag, bool isAfterSpace);
  void ReadEndTag();
  void EndElement();
  void ReadText();
  void ReadComment();
  void ReadInstruction();
  std::string_view ReadValue(std::string_view name);
  void ReadCData();
  const char *SkipUpTo(std::string_view delimiter, Refusal atEnd);
  void ReplaceReference();
  void ReplaceLineEnd(std::string_view by);
  [[noreturn]] void RefuseEnd() const;

  void Count(const char *place);

  SourceCursor m_cursor;
  XMLHandler &m_handler;
  TextGatherer m_gatherer;
  NamespaceScope m_scope;
  std::vector<AttributeEvent> m_attributes; // of the start tag that is being read
  std::vector<OpenElement> m_open;
  std::size_t m_nodes = 0;
  bool m_hasElement = false;
};

DocumentReader::DocumentReader(std::string_view source, XMLHandler &handler)
    : m_cursor(source), m_handler(handler), m_gatherer(source.data() + source.size()), m_scope(m_cursor) {
  m_attributes.reserve(16);
  m_open.reserve(16);
}

void DocumentReader::Run() {
  ReadDocumentBeginning(m_cursor);
  while (!m_cursor.IsAtEnd()) {
    m_gatherer.Clear();
    if (m_open.empty()) {
      ReadOutside();
    } else if (m_cursor.Peek() == '<' && !m_cursor.IsAt(CDATA_BEGIN)) {
      ReadMarkup();
    } else {
      ReadText();
    }
  }
  if (!m_open.empty() || !m_hasElement) {
    RefuseEnd();
  }
}

void DocumentReader::RefuseEnd() const {
  const char *const end = m_cursor.GetPlace();
  if (m_open.empty()) {
    m_cursor.Refuse(Refusal::NO_ELEMENT, end);
  }
  m_cursor.Refuse(Refusal::ELEMENT_NOT_CLOSED, end, m_open.back().name, std::to_string(m_open.back().line));
}

/// Reads white space or one piece of markup before or after the document element.
void DocumentReader::ReadOutside() {
  if (m_cursor.SkipSpace()) {
    return;
  }
  if (m_cursor.IsAt(CDATA_BEGIN)) {
    m_cursor.Refuse(Refusal::CDATA_OUTSIDE_ELEMENT, m_cursor.GetPlace());
  }
  const Refusal refusal = m_hasElement ? Refusal::CONTENT_AFTER_ELEMENT : Refusal::TEXT_BEFORE_ELEMENT;
  if (m_cursor.Peek() != '<') {
    m_cursor.RefuseNext(refusal, refusal);
  }
  const bool isInstruction = m_cursor.IsAt(INSTRUCTION_BEGIN);
  if (m_hasElement && !isInstruction && !m_cursor.IsAt("<!")) {
    m_cursor.Refuse(refusal, m_cursor.GetPlace());
  }
  ReadMarkup();
}

/// Reads the markup that begins with the next character, "<".
void DocumentReader::ReadMarkup() {
  if (m_cursor.IsAt("</")) {
    ReadEndTag();
  } else if (m_cursor.IsAt(COMMENT_BEGIN)) {
    ReadComment();
  } else if (m_cursor.IsAt(INSTRUCTION_BEGIN)) {
    ReadInstruction();
  } else if (m_cursor.IsAt("<!DOCTYPE")) {
    m_cursor.Refuse(Refusal::DOCUMENT_TYPE, m_cursor.GetPlace());
  } else if (m_cursor.IsAt("<!")) {
    m_cursor.Advance(2);
    m_cursor.RefuseNext(Refusal::UNKNOWN_MARKUP, Refusal::UNKNOWN_MARKUP);
  } else {
    ReadStartTag();
  }
}

void DocumentReader::ReadStartTag() {
  const char *const tag = m_cursor.GetPlace();
  const SourcePosition position = m_cursor.GetPosition();
  if (m_open.size() == MAX_ELEMENT_DEPTH) {
    m_cursor.Refuse(Refusal::TOO_DEEP, tag);
  }
  Count(tag);
  m_cursor.Advance(1);
  const WrittenName name = m_cursor.ReadName(Refusal::ENDS_IN_START_TAG);
  if (name.text.empty()) {
    m_cursor.RefuseNext(Refusal::NO_NAME_AFTER_LESS_THAN, Refusal::ENDS_IN_START_TAG);
  }
  ReadAttributes(tag);
  const std::size_t declarations = m_scope.Enter(tag, name, m_attributes);
  m_handler.StartElement(name.text, m_attributes.data(), m_attributes.size(), position.line, position.column);
  m_hasElement = true;
  m_open.push_back({name.text, position.line, declarations});
  if (m_cursor.Skip("/>")) {
    EndElement();
  } else {
    m_cursor.Advance(1); // ">"
  }
}

/// Reads up to the ">" or "/>" that ends a start tag.
void DocumentReader::ReadAttributes(const char *tag) {
  m_attributes.clear();
  for (;;) {
    const bool isAfterSpace = m_cursor.SkipSpace();
    if (m_cursor.IsAt('>') || m_cursor.IsAt("/>")) {
      return;
    }
    if (m_cursor.IsAt('/')) {
      m_cursor.Advance(1);
      m_cursor.RefuseNext(Refusal::SLASH_IN_START_TAG, Refusal::ENDS_IN_START_TAG);
    }
    ReadAttribute(tag, isAfterSpace);
  }
}

void DocumentReader::ReadAttribute(const char *tag, bool isAfterSpace) {
  const char *const begin = m_cursor.GetPlace();
  if (!isAfterSpace && m_cursor.SkipNcName()) {
    m_cursor.Refuse(Refusal::NO_SPACE_BEFORE_ATTRIBUTE, begin);
  }
  const WrittenName name = m_cursor.ReadName(Refusal::ENDS_IN_START_TAG);
  if (name.text.empty()) {
    m_cursor.RefuseNext(Refusal::NOT_AN_ATTRIBUTE, Refusal::ENDS_IN_START_TAG);
  }
  if (m_attributes.size() == MAX_ATTRIBUTES) {
    m_cursor.Refuse(Refusal::TOO_MANY_ATTRIBUTES, tag);
  }
  Count(begin);
  m_cursor.SkipSpace();
  if (!m_cursor.Skip("=")) {
    m_cursor.RefuseNext(Refusal::ATTRIBUTE_WITHOUT_VALUE, Refusal::ENDS_IN_START_TAG, name.text);
  }
  m_cursor.SkipSpace();
  m_attributes.push_back({name.text, ReadValue(name.text), name.prefixLength});
}

/// Reads a quoted value and normalises it (XML 1.0, section 3.3.3, for attributes of no declared type).
std::string_view DocumentReader::ReadValue(std::string_view name) {
  if (!m_cursor.IsAt('"') && !m_cursor.IsAt('\'')) {
    m_cursor.RefuseNext(Refusal::VALUE_NOT_QUOTED, Refusal::ENDS_IN_START_TAG, name);
  }
  const char quote = m_cursor.Peek();
  m_cursor.Advance(1);
  m_gatherer.Begin(m_cursor.GetPlace());
  for (;;) {
    m_cursor.SkipPlain<PLAIN_IN_VALUE>();
    if (m_cursor.IsAtEnd()) {
      m_cursor.Refuse(Refusal::ENDS_IN_VALUE, m_cursor.GetPlace(), name);
    }
    const char *const place = m_cursor.GetPlace();
    switch (*place) {
    case '"':
    case '\'':
      m_cursor.Advance(1);
      if (*place == quote) {
        return m_gatherer.End(place);
      }
      break;
    case '<':
      m_cursor.Refuse(Refusal::LESS_THAN_IN_VALUE, place, name);
    case '&':
      ReplaceReference();
      break;
    case '\r':
    case '\n':
      ReplaceLineEnd(" ");
      break;
    case '\t':
      m_gatherer.Replace(place, place + 1, " ");
      m_cursor.Advance(1);
      break;
    default:
      m_cursor.SkipCharacter();
    }
  }
}

void DocumentReader::ReadEndTag() {
  const char *const tag = m_cursor.GetPlace();
  if (m_open.empty()) {
    m_cursor.Refuse(Refusal::END_TAG_WITHOUT_START_TAG, tag);
  }
  m_cursor.Advance(2);
  if (m_cursor.Skip(m_open.back().name, '>')) { // nearly always
    EndElement();
    return;
  }
  const WrittenName name = m_cursor.ReadName(Refusal::ENDS_IN_END_TAG);
  if (name.text.empty()) {
    m_cursor.RefuseNext(Refusal::NO_NAME_IN_END_TAG, Refusal::ENDS_IN_END_TAG);
  }
  if (name.text != m_open.back().name && !m_cursor.IsAtEnd()) {
    m_cursor.Refuse(Refusal::OTHER_END_TAG, tag, m_open.back().name, std::to_string(m_open.back().line));
  }
  m_cursor.SkipSpace();
  if (!m_cursor.Skip(">")) {
    m_cursor.RefuseNext(Refusal::MORE_IN_END_TAG, Refusal::ENDS_IN_END_TAG);
  }
  EndElement();
}

void DocumentReader::EndElement() {
  m_scope.Leave(m_open.back().declarations);
  m_open.pop_back();
  m_handler.EndElement();
}

/// Reads character data and CDATA sections up to the next markup of another kind.
void DocumentReader::ReadText() {
  const char *const begin = m_cursor.GetPlace();
  m_gatherer.Begin(begin);
  for (;;) {
    m_cursor.SkipPlain<PLAIN_IN_TEXT>();
    if (m_cursor.IsAtEnd()) {
      break;
    }
    const char *const place = m_cursor.GetPlace();
    if (*place == '<') {
      if (!m_cursor.IsAt(CDATA_BEGIN)) {
        break;
      }
      ReadCData();
    } else if (*place == '&') {
      ReplaceReference();
    } else if (*place == '\r') {
      ReplaceLineEnd("\n");
    } else if (m_cursor.IsAt(CDATA_END)) {
      m_cursor.Refuse(Refusal::CDATA_END_IN_TEXT, place);
    } else {
      m_cursor.SkipCharacter();
    }
  }
  const std::string_view text = m_gatherer.End(m_cursor.GetPlace());
  if (!text.empty()) { // empty CDATA sections without other text make no text node
    Count(begin);
    m_handler.Characters(text);
  }
}

/// Reads a CDATA section as part of the text around it.
void DocumentReader::ReadCData() {
  const char *const begin = m_cursor.GetPlace();
  m_cursor.Advance(CDATA_BEGIN.size());
  m_gatherer.Replace(begin, m_cursor.GetPlace(), "");
  const char *const end = SkipUpTo(CDATA_END, Refusal::ENDS_IN_CDATA);
  m_gatherer.Replace(end, m_cursor.GetPlace(), "");
}

/// Skips characters that are not markup, and the `delimiter` that ends them. Replaces the line ends among them.
/// @param atEnd the refusal if the document ends before the delimiter. @return where the delimiter begins.
const char *DocumentReader::SkipUpTo(std::string_view delimiter, Refusal atEnd) {
  for (;;) {
    m_cursor.SkipPlain<PLAIN_IN_MARKUP>();
    const char *const place = m_cursor.GetPlace();
    if (m_cursor.IsAtEnd()) {
      m_cursor.Refuse(atEnd, place);
    }
    if (m_cursor.Skip(delimiter)) {
      return place;
    }
    if (*place == '\r') {
      ReplaceLineEnd("\n");
    } else {
      m_cursor.SkipCharacter();
    }
  }
}

void DocumentReader::ReplaceReference() {
  const char *const begin = m_cursor.GetPlace();
  char replacement[4];
  const std::size_t length = ReadReference(m_cursor, replacement);
  m_gatherer.Replace(begin, m_cursor.GetPlace(), std::string_view(replacement, length));
}

/// Replaces a line end, which is CR, CR LF or LF (XML 1.0, section 2.11).
void DocumentReader::ReplaceLineEnd(std::string_view by) {
  const char *const begin = m_cursor.GetPlace();
  m_cursor.Skip("\r");
  m_cursor.SkipLineFeed();
  m_gatherer.Replace(begin, m_cursor.GetPlace(), by);
}

void DocumentReader::ReadComment() {
  Count(m_cursor.GetPlace());
  m_cursor.Advance(COMMENT_BEGIN.size());
  m_gatherer.Begin(m_cursor.GetPlace());
  const char *const end = SkipUpTo("--", Refusal::ENDS_IN_COMMENT);
  if (m_cursor.IsAtEnd()) {
    m_cursor.Refuse(Refusal::ENDS_IN_COMMENT, m_cursor.GetPlace());
  }
  if (!m_cursor.Skip(">")) {
    m_cursor.Refuse(Refusal::TWO_HYPHENS_IN_COMMENT, end);
  }
  m_handler.Comment(m_gatherer.End(end));
}

void DocumentReader::ReadInstruction() {
  Count(m_cursor.GetPlace());
  const std::string_view target = m_cursor.ReadTarget();
  if (!m_cursor.SkipSpace() && !m_cursor.IsAt(INSTRUCTION_END)) {
    m_cursor.RefuseNext(Refusal::NO_SPACE_AFTER_TARGET, Refusal::ENDS_IN_INSTRUCTION);
  }
  m_gatherer.Begin(m_cursor.GetPlace());
  const char *const end = SkipUpTo(INSTRUCTION_END, Refusal::ENDS_IN_INSTRUCTION);
  m_handler.ProcessingInstruction(target, m_gatherer.End(end));
}

/// Counts a node or an attribute that begins at `place`.
void DocumentReader::Count(const char *place) {
  if (m_nodes == MAX_NODES) {
    m_cursor.Refuse(Refusal::TOO_MANY_NODES, place);
  }
  ++m_nodes;
}

} // namespace

void ReadDocument(std::string_view source, XMLHandler &handler) {
  DocumentReader(source, handler).Run();
}

} // namespace Tarvel::Xml
