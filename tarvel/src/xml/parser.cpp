// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/parser.h>

#include "xml/document_reader.h"
#include "xml/tree_builder.h"

#include <tarvel/core/secret_text.h>

#include <string>
#include <utility>

namespace Tarvel::Xml {

namespace {

/// The text of a document, which may contain a bearer token. It does not move while views of it are in use.
class SourceText final : public Object {
public:
  explicit SourceText(std::string &&text) noexcept : m_text(std::move(text)) {}
  std::string_view Get() const noexcept { return m_text.Get(); }

private:
  const SecretText m_text;
};

class XMLParserImpl final : public XMLParser {
public:
  explicit XMLParserImpl(Ref<XMLHandler> handler) noexcept : m_handler(std::move(handler)) {}

  Ref<Object> Parse(Reader &reader) override {
    const Ref<SourceText> source = MakeRef<SourceText>(reader.ReadToEnd(MAX_DOCUMENT_BYTES));
    m_handler->StartDocument(source->Get(), source);
    ReadDocument(source->Get(), *m_handler);
    return m_handler->TakeResult();
  }

private:
  const Ref<XMLHandler> m_handler;
};

} // namespace

XMLParseException::XMLParseException(const std::string &detail, std::uint32_t line, std::uint32_t column)
    : Exception(detail + " at line " + std::to_string(line) + ", column " + std::to_string(column)), m_line(line),
      m_column(column) {}

XMLParseException::~XMLParseException() = default;

XMLParseException *XMLParseException::Clone() const {
  return new XMLParseException(*this);
}

void XMLParseException::Throw() const {
  throw *this;
}

XMLParser::~XMLParser() = default;

Ref<XMLHandler> CreateXMLDocumentHandler() {
  return MakeRef<TreeBuilder>();
}

Ref<XMLParser> CreateXMLParser(const Ref<XMLHandler> &handler) {
  return MakeRef<XMLParserImpl>(handler);
}

} // namespace Tarvel::Xml
