// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/node.h>

#include "xml/characters.h"
#include "xml/escapes.h"

#include <tarvel/core/secure_wipe.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string_view>

namespace Tarvel::Xml {

namespace {

constexpr std::size_t FLUSH_BYTES = 8 * 1024;

/// An instance of `FindEscaped`: finds the first byte that is written as a reference.
using FindFunction = const char *(*)(const char *from, const char *end) noexcept;

/// What is written as a reference, in each context.
struct Escapes {
  FindFunction findInText;
  FindFunction findInAttribute;
};

constexpr Escapes ESCAPES_IN_UTF8 = {&FindEscaped<ESCAPED_IN_TEXT>, &FindEscaped<ESCAPED_IN_ATTRIBUTE>};
constexpr Escapes ESCAPES_IN_ASCII = {&FindEscaped<ESCAPED_IN_TEXT | ESCAPED_IN_ASCII>,
                                      &FindEscaped<ESCAPED_IN_ATTRIBUTE | ESCAPED_IN_ASCII>};

/// Buffers the markup, so that the writer is called with larger pieces. The buffer is wiped: its content may be secret.
class MarkupOutput {
public:
  explicit MarkupOutput(Writer &writer) : m_writer(writer) {}
  MarkupOutput(const MarkupOutput &) = delete;
  MarkupOutput &operator=(const MarkupOutput &) = delete;
  ~MarkupOutput() { SecureWipe(m_buffer.get(), FLUSH_BYTES); }

  MarkupOutput &operator<<(std::string_view markup) {
    if (markup.size() > FLUSH_BYTES - m_used) {
      WritePastBuffer(markup);
      return *this;
    }
    Put(markup);
    return *this;
  }

  MarkupOutput &operator<<(char markup) { return *this << std::string_view(&markup, 1); }

  /// Writes `text`, with a reference in place of each character that `find` finds.
  void WriteEscaped(std::string_view text, FindFunction find) {
    for (;;) {
      const char *const found = find(text.data(), text.data() + text.size());
      std::size_t offset = static_cast<std::size_t>(found - text.data());
      *this << text.substr(0, offset);
      if (offset == text.size()) {
        return;
      }
      if (ESCAPE_SETS[static_cast<unsigned char>(*found)] == ESCAPED_IN_ASCII) {
        WriteNumber(ReadCharacter(text, offset));
      } else {
        *this << EscapeOf(text[offset++]);
      }
      text.remove_prefix(offset);
    }
  }

  void Flush() {
    m_writer.Write(std::string_view(m_buffer.get(), m_used));
    m_used = 0;
  }

private:
  void Put(std::string_view markup) {
    markup.copy(m_buffer.get() + m_used, markup.size());
    m_used += markup.size();
  }

  void WritePastBuffer(std::string_view markup) {
    Flush();
    if (markup.size() > FLUSH_BYTES) {
      m_writer.Write(markup);
    } else {
      Put(markup);
    }
  }

  /// `character` is valid: the texts of a tree are UTF-8.
  void WriteNumber(std::uint32_t character) {
    constexpr std::string_view DIGITS = "0123456789ABCDEF";
    std::array<char, 8> digits{}; // enough for 32 bits
    std::size_t begin = digits.size();
    for (std::uint32_t rest = character; rest > 0; rest /= 16) {
      digits[--begin] = DIGITS[rest % 16];
    }
    *this << "&#x" << std::string_view(digits.data() + begin, digits.size() - begin) << ";";
    SecureWipe(digits.data(), digits.size());
  }

  Writer &m_writer;
  const std::unique_ptr<char[]> m_buffer = std::make_unique_for_overwrite<char[]>(FLUSH_BYTES);
  std::size_t m_used = 0;
};

void WriteStartTag(const ElementNode &element, const Escapes &escapes, MarkupOutput &output) {
  output << '<' << element.GetName();
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    output << ' ' << attribute->GetName() << "=\"";
    output.WriteEscaped(attribute->GetValue(), escapes.findInAttribute);
    output << '"';
  }
  output << '>';
}

/// Writes the node; of an element, only the start tag.
void WriteBegin(const Node &node, const Escapes &escapes, MarkupOutput &output) {
  switch (node.GetKind()) {
  case NodeKind::ELEMENT:
    WriteStartTag(static_cast<const ElementNode &>(node), escapes, output);
    break;
  case NodeKind::TEXT:
    output.WriteEscaped(static_cast<const TextNode &>(node).GetValue(), escapes.findInText);
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
    output << "</" << element->GetName() << '>';
  }
}

} // namespace

void ElementNode::WriteTo(Writer &writer, CharacterForm form) const {
  const Escapes &escapes = form == CharacterForm::REFERENCES ? ESCAPES_IN_ASCII : ESCAPES_IN_UTF8;
  MarkupOutput output(writer);
  const Node *node = this;
  while (node) {
    WriteBegin(*node, escapes, output);
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

} // namespace Tarvel::Xml
