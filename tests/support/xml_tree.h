// SPDX-License-Identifier: Apache-2.0
/// @file
/// XML in tests: text to document, tree to text, and a description that two trees share only when they are equal.

#pragma once

#include <tarvel/core/checked_cast.h>
#include <tarvel/io/reader.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>

#include <string>
#include <string_view>

namespace Testing {

inline Tarvel::Ref<Tarvel::Xml::Document> ParseDocument(std::string text) {
  const Tarvel::Ref<Tarvel::Reader> reader = Tarvel::CreateStringReader(std::move(text));
  return Tarvel::CheckedCast<Tarvel::Xml::Document>(
      Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler())->Parse(*reader));
}

inline std::string WriteElement(const Tarvel::Xml::ElementNode &element) {
  const Tarvel::Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
  element.WriteTo(*writer);
  return writer->GetText();
}

/// "(" opens an element, ")" closes it; each name and value follows its length, so that none can be confused with
/// another.
inline std::string DescribeTree(const Tarvel::Xml::Node &top) {
  using namespace Tarvel::Xml;
  const auto quote = [](std::string_view text) { return std::to_string(text.size()) + ":" + std::string(text); };
  std::string description;
  const Node *node = &top;
  while (node) {
    if (const ElementNode *const element = AsElement(node)) {
      description += "(" + quote(element->GetName());
      for (const Attribute *attribute = element->GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
        description += " @" + quote(attribute->GetName()) + "=" + quote(attribute->GetValue());
      }
    } else if (const TextNode *const text = AsText(node)) {
      description += " text=" + quote(text->GetValue());
    } else if (node->GetKind() == NodeKind::COMMENT) {
      description += " comment=" + quote(static_cast<const CommentNode *>(node)->GetValue());
    } else if (node->GetKind() == NodeKind::PROCESSING_INSTRUCTION) {
      const auto *const instruction = static_cast<const ProcessingInstructionNode *>(node);
      description += " pi=" + quote(instruction->GetTarget()) + "?" + quote(instruction->GetData());
    }
    if (node->GetFirstChild()) {
      node = node->GetFirstChild();
      continue;
    }
    description += AsElement(node) ? ")" : "";
    while (node != &top && !node->GetNextSibling()) {
      node = node->GetParent();
      description += AsElement(node) ? ")" : "";
    }
    node = node == &top ? nullptr : node->GetNextSibling();
  }
  return description;
}

} // namespace Testing
