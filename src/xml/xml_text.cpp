// SPDX-License-Identifier: Apache-2.0

#include "xml/xml_text.h"

#include <tarvel/core/checked_cast.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/canonicalizer.h>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Xml::Document;

// The published URI has no "#" at its end. The canonicalizer accepts this spelling for the same algorithm.
constexpr const char *CANONICAL_XML = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#";

} // namespace

void ParseXML(Tarvel::Reader &reader, Ref<Document> &document) {
  const Ref<Tarvel::Xml::XMLHandler> handler = Tarvel::Xml::CreateXMLDocumentHandler();
  const Ref<Tarvel::Xml::XMLParser> parser = Tarvel::Xml::CreateXMLParser(handler);
  document = Tarvel::CheckedCast<Document>(parser->Parse(reader));
}

void ParseXML(const std::string &text, Ref<Document> &document) {
  const Ref<Tarvel::Reader> reader = Tarvel::CreateStringReader(text);
  ParseXML(*reader, document);
}

const Tarvel::Xml::TextNode *GetTextNode(const Tarvel::Xml::Node *node) noexcept {
  return node ? Tarvel::Xml::AsText(node->GetFirstChild()) : nullptr;
}

std::string GetText(const Tarvel::Xml::TextNode *textNode) {
  return textNode ? std::string(textNode->GetValue()) : std::string();
}

std::string CanonicalElementText(const Tarvel::Xml::ElementNode &element) {
  const Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
  Tarvel::Xml::Security::CreateCanonicalizer(CANONICAL_XML)->Canonicalize(element, *writer);
  return writer->TakeText();
}

} // namespace SsoClient
