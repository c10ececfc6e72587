// SPDX-License-Identifier: Apache-2.0

#include "readers.h"

#include "xml/document_reader.h"

#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/parser.h>

#include <string>

namespace Testing {

namespace {

using Tarvel::Object;
using Tarvel::Ref;
using Tarvel::Xml::AttributeEvent;

class Recorder final : public Tarvel::Xml::XMLHandler {
public:
  Recorder(std::string_view document, Reading &reading) : m_document(document), m_reading(reading) {}

  void StartDocument(std::string_view, const Ref<Object> &) override {}

  void StartElement(std::string_view name, const AttributeEvent *attributes, std::size_t count, std::uint32_t line,
                    std::uint32_t column) override {
    m_reading.offsets.push_back(OffsetOf(m_document, line, column));
    m_reading.events.StartElement(name);
    m_reading.declarationsFirst.StartElement(name);
    for (std::size_t i = 0; i < count; ++i) {
      m_reading.events.Attribute(attributes[i].name, attributes[i].value);
      if (IsDeclaration(attributes[i].name) && attributes[i].name != "xmlns:xml") {
        m_reading.declarationsFirst.Attribute(attributes[i].name, attributes[i].value);
      }
    }
    for (std::size_t i = 0; i < count; ++i) {
      if (!IsDeclaration(attributes[i].name)) {
        m_reading.declarationsFirst.Attribute(attributes[i].name, attributes[i].value);
      }
    }
  }

  void EndElement() override {
    m_reading.events.EndElement();
    m_reading.declarationsFirst.EndElement();
  }

  void Characters(std::string_view text) override {
    m_reading.events.Characters(text);
    m_reading.declarationsFirst.Characters(text);
  }

  void Comment(std::string_view text) override {
    m_reading.events.Comment(text);
    m_reading.declarationsFirst.Comment(text);
  }

  void ProcessingInstruction(std::string_view target, std::string_view data) override {
    m_reading.events.ProcessingInstruction(target, data);
    m_reading.declarationsFirst.ProcessingInstruction(target, data);
  }

  Ref<Object> TakeResult() override {
    m_reading.isAccepted = true;
    return {};
  }

private:
  const std::string_view m_document;
  Reading &m_reading;
};

void TakeRefusal(const Tarvel::Xml::XMLParseException &exception, Reading &reading) {
  reading.line = exception.GetLine();
  reading.column = exception.GetColumn();
  const std::string message = exception.what();
  reading.message = message.substr(0, message.rfind(" at line "));
}

} // namespace

Reading ReadWithPlatform(std::string_view document) {
  Reading reading;
  try {
    const auto source = Tarvel::CreateStringReader(std::string(document));
    Tarvel::Xml::CreateXMLParser(Tarvel::MakeRef<Recorder>(document, reading))->Parse(*source);
  } catch (const Tarvel::Xml::XMLParseException &exception) {
    TakeRefusal(exception, reading);
  }
  return reading;
}

Reading ReadInPlace(std::string_view document) {
  Reading reading;
  const Ref<Recorder> recorder = Tarvel::MakeRef<Recorder>(document, reading);
  try {
    Tarvel::Xml::ReadDocument(document, *recorder);
    reading.isAccepted = true;
  } catch (const Tarvel::Xml::XMLParseException &exception) {
    TakeRefusal(exception, reading);
  }
  return reading;
}

} // namespace Testing
