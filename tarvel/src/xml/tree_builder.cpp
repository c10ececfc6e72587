// SPDX-License-Identifier: Apache-2.0

#include "xml/tree_builder.h"

#include "xml/node_arena.h"

#include <algorithm>
#include <functional>
#include <utility>

namespace Tarvel {
namespace Xml {

namespace {

// Nodes take about as much room as the text of a token; more is there on demand.
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
  m_text = std::string_view();
  m_gathered.clear();
}

void TreeBuilder::StartElement(std::string_view name, const AttributeEvent *attributes, std::size_t count,
                               std::uint32_t line, std::uint32_t column) {
  EndText();
  ElementNode *const element = m_arena->New<ElementNode>(m_arena);
  element->SetName(Store(name));
  element->m_line = line;
  element->m_column = column;
  for (std::size_t i = 0; i < count; ++i) {
    const std::string_view attributeName = Store(attributes[i].name);
    element->AppendAttribute(attributeName, Store(attributes[i].value));
  }
  m_current->AppendNode(element);
  m_current = element;
}

void TreeBuilder::EndElement() {
  EndText();
  m_current = m_current->m_parent;
}

void TreeBuilder::Characters(std::string_view text) {
  if (m_gathered.empty() && m_text.empty() && IsInSource(text)) {
    m_text = text;
    return;
  }
  if (m_gathered.empty() && m_text.data() + m_text.size() == text.data() && IsInSource(text)) {
    m_text = std::string_view(m_text.data(), m_text.size() + text.size());
    return;
  }
  m_gathered.append(m_text).append(text);
  m_text = std::string_view();
}

void TreeBuilder::Comment(std::string_view text) {
  EndText();
  CommentNode *const comment = m_arena->New<CommentNode>(m_arena);
  comment->m_value = Store(text);
  m_current->AppendNode(comment);
}

void TreeBuilder::ProcessingInstruction(std::string_view target, std::string_view data) {
  EndText();
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

void TreeBuilder::EndText() {
  if (m_text.empty() && m_gathered.empty()) {
    return;
  }
  TextNode *const node = m_arena->New<TextNode>(m_arena);
  node->m_value = m_gathered.empty() ? m_text : m_arena->Copy(m_gathered);
  m_current->AppendNode(node);
  m_text = std::string_view();
  m_gathered.clear();
}

} // namespace Xml
} // namespace Tarvel
