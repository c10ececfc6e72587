// SPDX-License-Identifier: Apache-2.0

#include "xml/parse_xml.h"

#include <tarvel/core/checked_cast.h>
#include <tarvel/xml/parser.h>

namespace SsoClient {

using Tarvel::Ref;
using Tarvel::Xml::Document;

void ParseXML(Tarvel::Reader &reader, Ref<Document> &document) {
  const Ref<Tarvel::Xml::XMLHandler> handler = Tarvel::Xml::CreateXMLDocumentHandler();
  const Ref<Tarvel::Xml::XMLParser> parser = Tarvel::Xml::CreateXMLParser(handler);
  document = Tarvel::CheckedCast<Document>(parser->Parse(reader));
}

void ParseXML(const std::string &text, Ref<Document> &document) {
  const Ref<Tarvel::Reader> reader = Tarvel::CreateStringReader(text);
  ParseXML(*reader, document);
}

} // namespace SsoClient
