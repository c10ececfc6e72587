// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/node.h>

#include <tarvel/core/secure_wipe.h>

#include <array>
#include <cstddef>
#include <string>
#include <string_view>

namespace Tarvel {
namespace Xml {

namespace {

constexpr std::size_t FLUSH_BYTES = 8 * 1024;

/// A set of characters, asked for each byte that is written.
class CharacterSet {
public:
  constexpr explicit CharacterSet(std::string_view characters) {
    for (const char character : characters) {
      m_contains[static_cast<unsigned char>(character)] = true;
    }
  }

  /// The offset of the first character of `text` that is in the set, or the text's size.
  std::size_t FindIn(std::string_view text) const noexcept {
    std::size_t offset = 0;
    while (offset < text.size() && !m_contains[static_cast<unsigned char>(text[offset])]) {
      ++offset;
    }
    return offset;
  }

private:
  std::array<bool, 256> m_contains{};
};

// A parser turns a carriage return into a line feed and, in attribute values, all white space into blanks. A ">" may not
// follow "]]" in text.
constexpr CharacterSet SPECIAL_IN_TEXT("&<>\r");
constexpr CharacterSet SPECIAL_IN_ATTRIBUTES("&<\"\t\n\r");

/// Gathers the pieces of markup, so that the writer is called for larger ones. The buffer never grows, so that no copy of
/// a text that may be secret is left behind in the heap.
class MarkupOutput {
public:
  explicit MarkupOutput(Writer &writer) : m_writer(writer) { m_buffer.reserve(FLUSH_BYTES); }
  MarkupOutput(const MarkupOutput &) = delete;
  MarkupOutput &operator=(const MarkupOutput &) = delete;
  ~MarkupOutput() { SecureWipe(m_buffer); }

  MarkupOutput &operator<<(std::string_view markup) {
    if (markup.size() > FLUSH_BYTES - m_buffer.size()) {
      Flush();
    }
    if (markup.size() > FLUSH_BYTES) {
      m_writer.Write(markup);
      return *this;
    }
    m_buffer.append(markup);
    return *this;
  }

  /// Writes `text`, each of the characters in `special` as the reference that stands for it.
  void WriteEscaped(std::string_view text, const CharacterSet &special) {
    for (;;) {
      const std::size_t next = special.FindIn(text);
      if (next == text.size()) {
        *this << text;
        return;
      }
      *this << text.substr(0, next) << GetReference(text[next]);
      text.remove_prefix(next + 1);
    }
  }

  void Flush() {
    m_writer.Write(m_buffer);
    m_buffer.clear();
  }

private:
  static std::string_view GetReference(char character) noexcept {
    switch (character) {
    case '&':
      return "&amp;";
    case '<':
      return "&lt;";
    case '>':
      return "&gt;";
    case '"':
      return "&quot;";
    case '\t':
      return "&#x9;";
    case '\n':
      return "&#xA;";
    default:
      return "&#xD;";
    }
  }

  Writer &m_writer;
  std::string m_buffer;
};

void WriteStartTag(const ElementNode &element, MarkupOutput &output) {
  output << "<" << element.GetName();
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    output << " " << attribute->GetName() << "=\"";
    output.WriteEscaped(attribute->GetValue(), SPECIAL_IN_ATTRIBUTES);
    output << "\"";
  }
  output << ">";
}

/// Writes the node, or only the start tag of an element.
void WriteBegin(const Node &node, MarkupOutput &output) {
  switch (node.GetKind()) {
  case NodeKind::ELEMENT:
    WriteStartTag(static_cast<const ElementNode &>(node), output);
    break;
  case NodeKind::TEXT:
    output.WriteEscaped(static_cast<const TextNode &>(node).GetValue(), SPECIAL_IN_TEXT);
    break;
  case NodeKind::COMMENT:
    output << "<!--" << static_cast<const CommentNode &>(node).GetValue() << "-->";
    break;
  case NodeKind::PROCESSING_INSTRUCTION: {
    const auto &instruction = static_cast<const ProcessingInstructionNode &>(node);
    output << "<?" << instruction.GetTarget() << (instruction.GetData().empty() ? "" : " ") << instruction.GetData()
           << "?>";
    break;
  }
  case NodeKind::DOCUMENT: // is never below an element
    break;
  }
}

void WriteEnd(const Node &node, MarkupOutput &output) {
  if (const ElementNode *const element = AsElement(&node)) {
    output << "</" << element->GetName() << ">";
  }
}

} // namespace

void ElementNode::WriteTo(Writer &writer) const {
  MarkupOutput output(writer);
  const Node *node = this;
  while (node) {
    WriteBegin(*node, output);
    if (node->GetFirstChild()) {
      node = node->GetFirstChild();
      continue;
    }
    WriteEnd(*node, output);
    while (node != this && !node->GetNextSibling()) {
      node = node->GetParent();
      WriteEnd(*node, output);
    }
    node = node == this ? nullptr : node->GetNextSibling();
  }
  output.Flush();
}

} // namespace Xml
} // namespace Tarvel
