// SPDX-License-Identifier: Apache-2.0

#include "xml/sax_session.h"

#include "system/fork_gate.h"

#include <tarvel/core/string_util.h>

#include <libxml/SAX2.h>
#include <libxml/parserInternals.h>
#include <libxml/xmlerror.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <functional>
#include <mutex>

namespace Tarvel {
namespace Xml {

namespace {

constexpr std::size_t NPOS = std::string_view::npos;

// Our limits stand in place of libxml2's; the encoding is judged before. Without XML_PARSE_NOENT an ampersand in an attribute
// value would be reported as "&#38;". There are no other entities that the option could replace: a document type
// declaration is refused.
constexpr int PARSE_OPTIONS = XML_PARSE_NONET | XML_PARSE_HUGE | XML_PARSE_IGNORE_ENC | XML_PARSE_NOENT;

// An unbound prefix is no error here, but costs libxml2 a message that holds the name of the element again for each attribute.
// A document of the greatest length that has short names stays below this; one of long names would take minutes.
constexpr std::size_t MAX_UNBOUND_PREFIX_BYTES = 16 * MAX_DOCUMENT_BYTES;

std::string_view ToView(const xmlChar *text) noexcept {
  return text ? std::string_view(reinterpret_cast<const char *>(text)) : std::string_view();
}

std::string_view ToView(const xmlChar *begin, const xmlChar *end) noexcept {
  return std::string_view(reinterpret_cast<const char *>(begin), static_cast<std::size_t>(end - begin));
}

/// The first `character` in [begin, end), or null.
const char *FindCharacter(const char *begin, const char *end, char character) noexcept {
  return static_cast<const char *>(std::memchr(begin, character, static_cast<std::size_t>(end - begin)));
}

/// libxml2's words for an error, in one line and at a readable length.
std::string GetDetail(const xmlError &error) {
  std::string detail = error.message ? error.message : "the document is not well-formed";
  while (!detail.empty() && detail.back() == '\n') {
    detail.pop_back();
  }
  std::replace(detail.begin(), detail.end(), '\n', ' ');
  return StringUtil::Shorten(detail);
}

/// Gives a host that uses libxml2 itself its thread's last error back, which each of our errors would replace. Meanwhile
/// nothing is written to standard error, as errors are that belong to no parser.
class LastErrorKeeper {
public:
  LastErrorKeeper() : m_handler(xmlStructuredError), m_context(xmlStructuredErrorContext) {
    xmlSetStructuredErrorFunc(nullptr, [](void *, xmlErrorPtr) {});
    if (const xmlError *const last = xmlGetLastError()) {
      xmlCopyError(const_cast<xmlError *>(last), &m_kept);
    }
  }
  LastErrorKeeper(const LastErrorKeeper &) = delete;
  LastErrorKeeper &operator=(const LastErrorKeeper &) = delete;

  ~LastErrorKeeper() {
    xmlSetStructuredErrorFunc(m_context, m_handler);
    xmlResetLastError();
    if (m_kept.code != XML_ERR_OK) {
      xmlCopyError(&m_kept, &xmlLastError);
      xmlResetError(&m_kept);
    }
  }

private:
  const xmlStructuredErrorFunc m_handler;
  void *const m_context;
  xmlError m_kept{};
};

} // namespace

/// What libxml2 calls. Nothing may be thrown through its frames.
struct SaxSession::Callbacks {
  template <typename Handle>
  static void Call(void *data, Handle handle) noexcept {
    SaxSession &session = *static_cast<SaxSession *>(data);
    if (session.m_failure) {
      session.Stop();
      return;
    }
    try {
      handle(session);
    } catch (...) {
      session.m_failure = std::current_exception();
      session.Stop();
    }
  }

  static void InternalSubset(void *data, const xmlChar *, const xmlChar *, const xmlChar *) {
    Call(data, [](SaxSession &session) {
      const std::size_t begin = session.m_source.rfind("<!DOCTYPE", session.GetOffset());
      session.Refuse("a document type declaration is not accepted", begin == NPOS ? 0 : begin);
    });
  }

  static void StartElement(void *data, const xmlChar *, const xmlChar *, const xmlChar *, int namespaceCount,
                           const xmlChar **namespaces, int attributeCount, int, const xmlChar **attributes) {
    Call(data, [=](SaxSession &session) {
      session.StartElement(namespaces, static_cast<std::size_t>(namespaceCount), attributes,
                           static_cast<std::size_t>(attributeCount));
    });
  }

  static void EndElement(void *data, const xmlChar *, const xmlChar *, const xmlChar *) {
    Call(data, [](SaxSession &session) { session.EndElement(); });
  }

  static void Characters(void *data, const xmlChar *text, int length) {
    Call(data, [=](SaxSession &session) { session.m_handler.Characters(ToView(text, text + length)); });
  }

  static void Comment(void *data, const xmlChar *text) {
    Call(data, [=](SaxSession &session) { session.m_handler.Comment(ToView(text)); });
  }

  static void ProcessingInstruction(void *data, const xmlChar *target, const xmlChar *content) {
    Call(data, [=](SaxSession &session) { session.m_handler.ProcessingInstruction(ToView(target), ToView(content)); });
  }

  static void Error(void *data, xmlErrorPtr error) noexcept {
    SaxSession &session = *static_cast<SaxSession *>(data);
    if (session.m_failure) { // the first error tells most
      return;
    }
    try {
      session.TakeError(*error);
    } catch (...) {
      session.m_failure = std::current_exception();
    }
    // After an error that is not fatal libxml2 goes on with pointers into the input; the next event stops it.
    if (session.m_failure && error->level == XML_ERR_FATAL) {
      session.Stop();
    }
  }

  static xmlSAXHandler GetTable() noexcept {
    xmlSAXHandler table{};
    table.initialized = XML_SAX2_MAGIC;
    table.internalSubset = &InternalSubset;
    table.startElementNs = &StartElement;
    table.endElementNs = &EndElement;
    table.characters = &Characters;
    table.ignorableWhitespace = &Characters;
    table.cdataBlock = &Characters;
    table.comment = &Comment;
    table.processingInstruction = &ProcessingInstruction;
    table.serror = &Error;
    return table;
  }
};

/// The parser context, its callbacks and its input.
struct SaxSession::Context {
  explicit Context(SaxSession &session) : parser(xmlNewParserCtxt()) {
    if (!parser) {
      throw OutOfMemoryException();
    }
    session.m_parser = parser;
    *parser->sax = Callbacks::GetTable();
    parser->userData = &session;
    xmlCtxtUseOptions(parser, PARSE_OPTIONS);
    // Of libxml2's inputs this is the one that neither copies the text nor scans it again and again as it advances.
    const char *const text = session.m_source.data() + GetByteOrderMarkLength(session.m_source);
    const xmlParserInputPtr input = xmlNewStringInputStream(parser, reinterpret_cast<const xmlChar *>(text));
    if (!input || inputPush(parser, input) < 0) {
      xmlFreeInputStream(input);
      xmlFreeParserCtxt(parser);
      throw OutOfMemoryException();
    }
  }
  Context(const Context &) = delete;
  Context &operator=(const Context &) = delete;
  ~Context() { xmlFreeParserCtxt(parser); }

  xmlParserCtxtPtr parser;
};

SaxSession::SaxSession(std::string_view source, XMLHandler &handler)
    : m_source(source), m_handler(handler), m_lineBegin(GetByteOrderMarkLength(source)), m_lineCounted(m_lineBegin) {}

void SaxSession::Run() {
  const System::Computation computing; // libxml2 has locks of its own
  static std::once_flag initialised;
  std::call_once(initialised, [] { xmlInitParser(); });
  errno = 0;
  const LastErrorKeeper lastError;
  const Context context(*this);
  xmlParseDocument(context.parser);
  if (m_failure) {
    std::rethrow_exception(m_failure);
  }
  RequireMemory(context.parser->errNo);
  if (!context.parser->wellFormed) { // without having said why
    throw XMLParseException("the document is not well-formed", 1, 1);
  }
}

void SaxSession::StartElement(const xmlChar *const *namespaces, std::size_t namespaceCount,
                              const xmlChar *const *attributes, std::size_t attributeCount) {
  const std::size_t end = GetOffset(); // behind the last attribute
  // The tag before this one begins at m_lineCounted: what lies between is searched once.
  const char *const text = m_source.data();
  const void *const lessThan = memrchr(text + m_lineCounted, '<', end - m_lineCounted);
  const std::size_t begin = static_cast<std::size_t>(static_cast<const char *>(lessThan) - text);
  if (m_declarations.size() == MAX_ELEMENT_DEPTH) {
    Refuse("elements are nested deeper than " + std::to_string(MAX_ELEMENT_DEPTH), begin);
  }
  m_declarations.push_back(namespaceCount);
  m_declarationsInScope += namespaceCount;
  if (m_declarationsInScope > MAX_NAMESPACES_IN_SCOPE) {
    Refuse("more than " + std::to_string(MAX_NAMESPACES_IN_SCOPE) + " namespace declarations are in scope", begin);
  }
  ReadStartTag(begin, end, namespaces, namespaceCount, attributes, attributeCount);
  const SourcePosition position = AdvanceTo(begin);
  m_handler.StartElement(m_name, m_attributes.data(), m_attributes.size(), position.line, position.column);
}

void SaxSession::EndElement() {
  m_declarationsInScope -= m_declarations.back();
  m_declarations.pop_back();
  m_handler.EndElement();
}

// libxml2 hands out declarations and attributes apart from each other. Their order, and names that need no copy, are read
// from the start tag again, which is well-formed; the values are libxml2's.
void SaxSession::ReadStartTag(std::size_t begin, std::size_t end, const xmlChar *const *namespaces,
                              std::size_t namespaceCount, const xmlChar *const *attributes,
                              std::size_t attributeCount) {
  const auto isSpace = [](char c) { return c == ' ' || c == '\n' || c == '\t' || c == '\r'; };
  const char *const stop = m_source.data() + end;
  const char *const nameBegin = m_source.data() + begin + 1;
  const char *const nameEnd = std::find_if(nameBegin, stop, isSpace);
  m_name = std::string_view(nameBegin, static_cast<std::size_t>(nameEnd - nameBegin));
  m_attributes.clear();
  std::size_t seenAttributes = 0;
  std::size_t seenNamespaces = 0;
  for (const char *next = std::find_if_not(nameEnd, stop, isSpace); next != stop;
       next = std::find_if_not(next, stop, isSpace)) {
    const char *const equals = std::find(next, stop, '=');
    const char *const quote = std::find_if(equals, stop, [](char c) { return c == '"' || c == '\''; });
    const char *const close = quote == stop ? nullptr : FindCharacter(quote + 1, stop, *quote);
    if (!close) {
      break;
    }
    AttributeEvent event;
    event.name = std::string_view(next, static_cast<std::size_t>(std::find_if(next, equals, isSpace) - next));
    event.value = std::string_view(quote + 1, static_cast<std::size_t>(close - quote - 1));
    const bool isDeclaration = event.name.substr(0, 5) == "xmlns" && (event.name.size() == 5 || event.name[5] == ':');
    if (!isDeclaration && seenAttributes < attributeCount) {
      const xmlChar *const *const attribute = attributes + 5 * seenAttributes; // name, prefix, URI, value, its end
      event.value = ToView(attribute[3], attribute[4]);
      ++seenAttributes;
    }
    // libxml2 does not report a declaration of the prefix "xml", whose value can be one alone.
    if (isDeclaration && event.name != "xmlns:xml" && seenNamespaces < namespaceCount) {
      const std::string_view uri = ToView(namespaces[2 * seenNamespaces + 1]); // prefix, URI
      event.value = uri == event.value ? event.value : uri;
      ++seenNamespaces;
    }
    m_attributes.push_back(event);
    next = close + 1;
  }
  if (seenAttributes != attributeCount || seenNamespaces != namespaceCount) {
    Refuse("the attributes of an element cannot be told apart", begin);
  }
}

// Where libxml2 lacks memory it may report something else, such as a namespace name that is no URI, or nothing at all. But then
// `malloc` has set errno, which `Run` has reset and nothing in the parser changes.
void SaxSession::RequireMemory(int errorCode) {
  if (errorCode == XML_ERR_NO_MEMORY || errno == ENOMEM) {
    throw OutOfMemoryException();
  }
}

void SaxSession::TakeError(const xmlError &error) {
  if (error.level < XML_ERR_ERROR) {
    RequireMemory(error.code);
    return;
  }
  if (error.code == XML_NS_ERR_UNDEFINED_NAMESPACE) {
    m_unboundPrefixBytes += error.message ? std::strlen(error.message) : 0;
    if (m_unboundPrefixBytes > MAX_UNBOUND_PREFIX_BYTES) {
      Refuse("names with unbound prefixes are too many and too long", GetOffset());
    }
    return;
  }
  RequireMemory(error.code);
  Refuse(GetDetail(error), GetOffset());
}

std::size_t SaxSession::GetOffset() const noexcept {
  const char *const current = reinterpret_cast<const char *>(m_parser->input->cur);
  const std::less<const char *> isBefore;
  if (isBefore(current, m_source.data()) || isBefore(m_source.data() + m_source.size(), current)) {
    return m_lineCounted;
  }
  return static_cast<std::size_t>(current - m_source.data());
}

SourcePosition SaxSession::AdvanceTo(std::size_t offset) noexcept {
  const char *const text = m_source.data();
  while (const void *const lineBreak = std::memchr(text + m_lineCounted, '\n', offset - m_lineCounted)) {
    ++m_line;
    m_lineBegin = m_lineCounted = static_cast<std::size_t>(static_cast<const char *>(lineBreak) - text) + 1;
  }
  m_lineCounted = offset;
  return {m_line, static_cast<std::uint32_t>(1 + offset - m_lineBegin)};
}

void SaxSession::Refuse(const std::string &detail, std::size_t offset) const {
  const SourcePosition position = GetPosition(m_source, offset);
  throw XMLParseException(detail, position.line, position.column);
}

void SaxSession::Stop() noexcept {
  xmlStopParser(m_parser);
}

} // namespace Xml
} // namespace Tarvel
