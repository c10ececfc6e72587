// SPDX-License-Identifier: Apache-2.0

#include "readers.h"

#include <libxml/parser.h>

#include <memory>
#include <string>

namespace Testing {

namespace {

// A context keeps the names that it has read, so a new one replaces it after this many documents.
constexpr std::size_t DOCUMENTS_OF_A_CONTEXT = 4096;
constexpr int OPTIONS = XML_PARSE_NONET | XML_PARSE_HUGE | XML_PARSE_IGNORE_ENC | XML_PARSE_NOENT;

std::string_view ToView(const xmlChar *text) {
  return text ? std::string_view(reinterpret_cast<const char *>(text)) : std::string_view();
}

std::string QualifiedName(const xmlChar *prefix, const xmlChar *localName) {
  return prefix ? std::string(ToView(prefix)).append(":").append(ToView(localName)) : std::string(ToView(localName));
}

struct Session {
  xmlParserCtxtPtr parser;
  Reading reading;
  bool isRefused = false;

  void Refuse(int code, std::string_view message, int line) {
    isRefused = true;
    reading.code = code;
    reading.message = message.substr(0, message.find_last_not_of('\n') + 1);
    reading.line = static_cast<std::uint32_t>(line);
  }
};

Session &Self(void *self) {
  return *static_cast<Session *>(self);
}

void OnDocumentType(void *self, const xmlChar *, const xmlChar *, const xmlChar *) {
  Self(self).reading.hasDocumentType = !Self(self).isRefused;
  xmlStopParser(Self(self).parser);
}

void OnStartElement(void *self, const xmlChar *localName, const xmlChar *prefix, const xmlChar *, int namespaceCount,
                    const xmlChar **namespaces, int attributeCount, int, const xmlChar **attributes) {
  EventText &events = Self(self).reading.declarationsFirst;
  events.StartElement(QualifiedName(prefix, localName));
  for (int i = 0; i < namespaceCount; ++i) {
    const xmlChar *const declared = namespaces[2 * i];
    events.Attribute(declared ? "xmlns:" + std::string(ToView(declared)) : "xmlns", ToView(namespaces[2 * i + 1]));
  }
  for (int i = 0; i < attributeCount; ++i) {
    const xmlChar *const *const attribute = attributes + 5 * i; // name, prefix, URI, value, its end
    events.Attribute(QualifiedName(attribute[1], attribute[0]),
                     ToView(attribute[3]).substr(0, static_cast<std::size_t>(attribute[4] - attribute[3])));
  }
}

void OnEndElement(void *self, const xmlChar *, const xmlChar *, const xmlChar *) {
  Self(self).reading.declarationsFirst.EndElement();
}

void OnCharacters(void *self, const xmlChar *text, int length) {
  Self(self).reading.declarationsFirst.Characters(
      {reinterpret_cast<const char *>(text), static_cast<std::size_t>(length)});
}

void OnComment(void *self, const xmlChar *text) {
  Self(self).reading.declarationsFirst.Comment(ToView(text));
}

void OnInstruction(void *self, const xmlChar *target, const xmlChar *data) {
  Self(self).reading.declarationsFirst.ProcessingInstruction(ToView(target), ToView(data));
}

void OnError(void *self, xmlErrorPtr error) {
  Session &session = Self(self);
  if (session.isRefused || session.reading.hasDocumentType || error->level < XML_ERR_ERROR) {
    return;
  }
  if (error->code == XML_NS_ERR_UNDEFINED_NAMESPACE) {
    session.reading.hasUnboundPrefix = true;
    return;
  }
  session.Refuse(error->code, error->message ? error->message : "", error->line);
  if (error->level == XML_ERR_FATAL) {
    xmlStopParser(session.parser);
  }
}

using ParserHandle = std::unique_ptr<xmlParserCtxt, decltype(&xmlFreeParserCtxt)>;

ParserHandle MakeParser() {
  xmlInitParser();
  // Without this, libxml2 would print an error outside a parser, such as text that cannot be recoded.
  xmlSetStructuredErrorFunc(nullptr, [](void *, xmlErrorPtr) {});
  ParserHandle parser(xmlNewParserCtxt(), &xmlFreeParserCtxt);
  xmlSAXHandler table{};
  table.initialized = XML_SAX2_MAGIC;
  table.internalSubset = &OnDocumentType;
  table.startElementNs = &OnStartElement;
  table.endElementNs = &OnEndElement;
  table.characters = &OnCharacters;
  table.ignorableWhitespace = &OnCharacters;
  table.cdataBlock = &OnCharacters;
  table.comment = &OnComment;
  table.processingInstruction = &OnInstruction;
  table.serror = &OnError;
  *parser->sax = table;
  return parser;
}

} // namespace

Reading ReadWithLibxml2(std::string_view document) {
  thread_local ParserHandle parser = MakeParser();
  thread_local std::size_t documents = 0;
  if (++documents % DOCUMENTS_OF_A_CONTEXT == 0) {
    parser = MakeParser();
  }
  Session session{parser.get(), {}};
  parser->userData = &session;
  xmlFreeDoc(
      xmlCtxtReadMemory(parser.get(), document.data(), static_cast<int>(document.size()), nullptr, nullptr, OPTIONS));
  parser->userData = nullptr;
  session.reading.isAccepted = session.reading.hasDocumentType || (!session.isRefused && parser->wellFormed);
  return session.reading;
}

} // namespace Testing
