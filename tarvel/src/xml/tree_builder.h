// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TreeBuilder`, the handler that builds a `Document`.

#pragma once

#include <tarvel/xml/node.h>
#include <tarvel/xml/parser.h>

#include <string_view>

namespace Tarvel::Xml {

/// Texts that are part of the document's source stay views of it; the others are copied into the arena of the tree.
class TreeBuilder final : public XMLHandler {
public:
  void StartDocument(std::string_view source, const Ref<Object> &owner) override;
  void StartElement(std::string_view name, const AttributeEvent *attributes, std::size_t count, std::uint32_t line,
                    std::uint32_t column) override;
  void EndElement() override;
  void Characters(std::string_view text) override;
  void Comment(std::string_view text) override;
  void ProcessingInstruction(std::string_view target, std::string_view data) override;
  Ref<Object> TakeResult() override;

private:
  bool IsInSource(std::string_view text) const noexcept;
  std::string_view Store(std::string_view text);

  Ref<DocumentNode> m_document;
  NodeArena *m_arena = nullptr; // the document node's
  Node *m_current = nullptr;    // the open element, or the document
  std::string_view m_source;
};

} // namespace Tarvel::Xml
