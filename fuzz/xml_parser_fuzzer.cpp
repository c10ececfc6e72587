// SPDX-License-Identifier: Apache-2.0
/// @file
/// XML documents: the reader accepts and refuses the same documents as libxml2 and expat, and reports the same events,
/// except for listed differences. A refusal is the one documented exception, with the position of the error. An
/// accepted document becomes a tree of exactly the reported events; written as text and read again, it gives the same
/// tree.

#include "integration/reader_oracle/comparison.h"
#include "integration/reader_oracle/readers.h"
#include "integration/reader_oracle/refusal_position.h"

#include "support/xml_tree.h"

#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <string>
#include <string_view>

namespace {

using namespace Tarvel::Xml;
using Testing::Comparison;
using Testing::EventText;
using Testing::Reading;

void Require(bool condition, std::string_view what, std::string_view detail = "") {
  if (!condition) {
    std::cerr << what << ": " << detail << std::endl;
    std::abort();
  }
}

void RecordBeginning(const Node &node, EventText &events) {
  if (const ElementNode *const element = AsElement(&node)) {
    events.StartElement(element->GetName());
    for (const Attribute *attribute = element->GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
      events.Attribute(attribute->GetName(), attribute->GetValue());
    }
  } else if (const TextNode *const text = AsText(&node)) {
    events.Characters(text->GetValue());
  } else if (node.GetKind() == NodeKind::COMMENT) {
    events.Comment(static_cast<const CommentNode &>(node).GetValue());
  } else if (node.GetKind() == NodeKind::PROCESSING_INSTRUCTION) {
    const auto &instruction = static_cast<const ProcessingInstructionNode &>(node);
    events.ProcessingInstruction(instruction.GetTarget(), instruction.GetData());
  }
}

/// The events that a reader would report for such a tree.
EventText RecordTree(const Node &top) {
  EventText events;
  const Node *node = &top;
  while (node) {
    RecordBeginning(*node, events);
    if (node->GetFirstChild()) {
      node = node->GetFirstChild();
      continue;
    }
    if (AsElement(node)) {
      events.EndElement();
    }
    while (node != &top && !node->GetNextSibling()) {
      node = node->GetParent();
      if (AsElement(node)) {
        events.EndElement();
      }
    }
    node = node == &top ? nullptr : node->GetNextSibling();
  }
  return events;
}

void CheckTree(const std::string &text, const Reading &reading) {
  const auto document = Testing::ParseDocument(text);
  const ElementNode &root = *document->GetDocumentElement();
  Require(RecordTree(*root.GetRoot()).Get() == reading.events.Get(), "another tree than the events'",
          Testing::Escaped(reading.events.Get()));
  const std::string written = Testing::WriteElement(root);
  const auto again = Testing::ParseDocument(written);
  Require(Testing::DescribeTree(*again->GetDocumentElement()) == Testing::DescribeTree(root), "written as another tree",
          Testing::Escaped(written));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char *>(data), size);
  const Comparison comparison = Testing::Compare(text);
  Require(comparison.unexplained.empty(), "read otherwise than by others", comparison.unexplained);
  const Reading &ours = comparison.ours;
  // Without a copy, so that a sanitizer detects a read outside the text.
  const Reading inPlace = Testing::ReadInPlace(text);
  Require(inPlace.message == ours.message && inPlace.events.Get() == ours.events.Get(), "read otherwise in place",
          Testing::Escaped(text));
  if (ours.isAccepted) {
    CheckTree(std::string(text), ours);
    return 0;
  }
  const std::string wrong = Testing::DescribeWrongPosition(text, ours);
  Require(wrong.empty(), "wrong position", wrong);
  return 0;
}
