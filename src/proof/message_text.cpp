// SPDX-License-Identifier: Apache-2.0

#include "proof/message_text.h"

#include <tarvel/core/ref.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/node.h>

namespace SsoClient {

namespace {

using Tarvel::Xml::Node;
using Tarvel::Xml::NodeKind;

/// Writes a child of the document other than its element.
void WriteOutside(const Node &node, Tarvel::Writer &writer) {
  if (node.GetKind() == NodeKind::COMMENT) {
    writer.Write("<!--");
    writer.Write(static_cast<const Tarvel::Xml::CommentNode &>(node).GetValue());
    writer.Write("-->");
    return;
  }
  const auto &instruction = static_cast<const Tarvel::Xml::ProcessingInstructionNode &>(node);
  writer.Write("<?");
  writer.Write(instruction.GetTarget());
  writer.Write(instruction.GetData().empty() ? "" : " ");
  writer.Write(instruction.GetData());
  writer.Write("?>");
}

} // namespace

std::string WriteMessage(const Tarvel::Xml::Document &document) {
  const Tarvel::Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
  for (const Node *node = document.GetDocumentNode()->GetFirstChild(); node; node = node->GetNextSibling()) {
    if (const Tarvel::Xml::ElementNode *const element = AsElement(node)) {
      element->WriteTo(*writer);
    } else {
      WriteOutside(*node, *writer);
    }
    writer->Write(node->GetNextSibling() ? "\n" : "");
  }
  return writer->TakeText();
}

} // namespace SsoClient
