// SPDX-License-Identifier: Apache-2.0

#include "xml/tree_builder.h"

#include "xml/node_arena.h"

#include <algorithm>
#include <functional>
#include <utility>

namespace Tarvel::Xml {

namespace {

// The nodes of a token take up to twice as much memory as its text. More is allocated on demand.
constexpr std::size_t SMALLEST_ARENA_BYTES = 1024;
constexpr std::size_t LARGEST_ARENA_BYTES = 64 * 1024;

class DocumentImpl final : public Document {
public:
  explicit DocumentImpl(Ref<DocumentNode> root) noexcept : m_root(std::move(root)) {}

  const DocumentNode *GetDocumentNode() const noexcept override { return m_root.get(); }
  const ElementNode *GetDocumentElement() const noexcept override { return FindDocumentElement(); }
  ElementNode *GetDocumentElement() noexcept override { return FindDocumentElement(); }

private:
  ElementNode *FindDocumentElement() const noexcept {
    Node *node = m_root->GetFirstChild();
    while (node && node->GetKind() != NodeKind::ELEMENT) {
      node = node->GetNextSibling();
    }
    return AsElement(node);
  }

  Ref<DocumentNode> m_root;
};

} // namespace

Document::~Document() = default;

XMLHandler::~XMLHandler() = default;

void TreeBuilder::StartDocument(std::string_view source, const Ref<Object> &owner) {
  m_arena = NodeArena::Create(std::clamp(2 * source.size(), SMALLEST_ARENA_BYTES, LARGEST_ARENA_BYTES));
  m_document = Ref<DocumentNode>(m_arena->New<DocumentNode>(m_arena));
  m_arena->Keep(owner);
  m_current = m_document.get();
  m_source = source;
}

void TreeBuilder::StartElement(std::string_view name, const AttributeEvent *attributes, std::size_t count,
                               std::uint32_t line, std::uint32_t column) {
  ElementNode *const element = m_arena->New<ElementNode>(m_arena);
  element->SetName(Store(name));
  element->m_line = line;
  element->m_column = column;
  ElementNode::AttributeEnd end{&element->m_firstAttribute, &element->m_firstDeclaration};
  for (std::size_t i = 0; i < count; ++i) {
    element->AppendAttribute(end, Store(attributes[i].name), attributes[i].prefixLength, Store(attributes[i].value));
  }
  m_current->AppendNode(element);
  m_current = element;
}

void TreeBuilder::EndElement() {
  m_current = m_current->m_parent;
}

void TreeBuilder::Characters(std::string_view text) {
  TextNode *const node = m_arena->New<TextNode>(m_arena);
  node->m_value = Store(text);
  m_current->AppendNode(node);
}

void TreeBuilder::Comment(std::string_view text) {
  CommentNode *const comment = m_arena->New<CommentNode>(m_arena);
  comment->m_value = Store(text);
  m_current->AppendNode(comment);
}

void TreeBuilder::ProcessingInstruction(std::string_view target, std::string_view data) {
  ProcessingInstructionNode *const instruction = m_arena->New<ProcessingInstructionNode>(m_arena);
  instruction->m_target = Store(target);
  instruction->m_data = Store(data);
  m_current->AppendNode(instruction);
}

Ref<Object> TreeBuilder::TakeResult() {
  m_current = nullptr;
  m_arena = nullptr;
  return MakeRef<DocumentImpl>(std::move(m_document));
}

bool TreeBuilder::IsInSource(std::string_view text) const noexcept {
  const std::less_equal<const char *> notAfter;
  return notAfter(m_source.data(), text.data()) &&
         notAfter(text.data() + text.size(), m_source.data() + m_source.size());
}

std::string_view TreeBuilder::Store(std::string_view text) {
  return IsInSource(text) ? text : m_arena->Copy(text);
}

} // namespace Tarvel::Xml
