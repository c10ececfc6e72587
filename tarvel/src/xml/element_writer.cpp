// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/node.h>

#include "xml/characters.h"

#include <tarvel/core/secure_wipe.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <string_view>

namespace Tarvel::Xml {

namespace {

constexpr std::size_t FLUSH_BYTES = 8 * 1024;
constexpr unsigned char FIRST_BEYOND_ASCII = 0x80;

constexpr std::uint64_t EACH_BYTE = 0x0101010101010101;
constexpr std::size_t WORD_BYTES = sizeof(std::uint64_t);

/// Whether none of the eight bytes is written as a reference, wherever they are: all are ASCII from the blank on, and none is
/// one of `&<>"`. The subtractions borrow from a byte's high bit, or from the byte after one that is special already.
bool IsPlainWord(const char *bytes) noexcept {
  std::uint64_t word = 0;
  std::memcpy(&word, bytes, WORD_BYTES);
  std::uint64_t special = word | (word - EACH_BYTE * ' ');
  for (const char character : {'&', '<', '>', '"'}) {
    special |= (word ^ EACH_BYTE * static_cast<std::uint64_t>(character)) - EACH_BYTE;
  }
  return (special & EACH_BYTE * FIRST_BEYOND_ASCII) == 0;
}

/// A set of characters, each of which is written as a reference.
class CharacterSet {
public:
  /// @param form with references, every byte of a character beyond ASCII is in the set as well.
  constexpr CharacterSet(std::string_view characters, CharacterForm form) {
    for (const char character : characters) {
      m_contains[static_cast<unsigned char>(character)] = true;
    }
    for (std::size_t byte = FIRST_BEYOND_ASCII; byte < m_contains.size(); ++byte) {
      m_contains[byte] = form == CharacterForm::REFERENCES;
    }
  }

  /// The offset of the first character of `text` that is in the set, or the text's size.
  std::size_t FindIn(std::string_view text) const noexcept {
    std::size_t offset = 0;
    while (text.size() - offset >= WORD_BYTES && IsPlainWord(text.data() + offset)) {
      offset += WORD_BYTES;
    }
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
constexpr std::string_view SPECIAL_IN_TEXT = "&<>\r";
constexpr std::string_view SPECIAL_IN_ATTRIBUTES = "&<\"\t\n\r";

/// What is written as a reference.
struct Specials {
  CharacterSet inText;
  CharacterSet inAttributes;
};

constexpr Specials SpecialsOf(CharacterForm form) {
  return {CharacterSet(SPECIAL_IN_TEXT, form), CharacterSet(SPECIAL_IN_ATTRIBUTES, form)};
}

constexpr Specials SPECIALS_OF_UTF8 = SpecialsOf(CharacterForm::UTF8);
constexpr Specials SPECIALS_OF_REFERENCES = SpecialsOf(CharacterForm::REFERENCES);

/// Gathers the pieces of markup, so that the writer is called for larger ones. What was gathered is wiped: it may be secret.
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

  /// Writes `text`, each of the characters in `special` as the reference that stands for it.
  void WriteEscaped(std::string_view text, const CharacterSet &special) {
    for (;;) {
      const std::size_t next = special.FindIn(text);
      if (next == text.size()) {
        *this << text;
        return;
      }
      *this << text.substr(0, next);
      std::size_t behind = next;
      if (static_cast<unsigned char>(text[next]) >= FIRST_BEYOND_ASCII) {
        WriteNumber(ReadCharacter(text, behind));
      } else {
        *this << GetReference(text[behind++]);
      }
      text.remove_prefix(behind);
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

  /// The texts of a tree are UTF-8: `character` is one.
  void WriteNumber(std::uint32_t character) {
    constexpr std::string_view DIGITS = "0123456789ABCDEF";
    std::array<char, 8> digits{}; // of 32 bits
    std::size_t begin = digits.size();
    for (std::uint32_t rest = character; rest > 0; rest /= 16) {
      digits[--begin] = DIGITS[rest % 16];
    }
    *this << "&#x" << std::string_view(digits.data() + begin, digits.size() - begin) << ";";
    SecureWipe(digits.data(), digits.size());
  }

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
  const std::unique_ptr<char[]> m_buffer = std::make_unique_for_overwrite<char[]>(FLUSH_BYTES);
  std::size_t m_used = 0;
};

void WriteStartTag(const ElementNode &element, const Specials &specials, MarkupOutput &output) {
  output << '<' << element.GetName();
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    output << ' ' << attribute->GetName() << "=\"";
    output.WriteEscaped(attribute->GetValue(), specials.inAttributes);
    output << '"';
  }
  output << '>';
}

/// Writes the node, or only the start tag of an element.
void WriteBegin(const Node &node, const Specials &specials, MarkupOutput &output) {
  switch (node.GetKind()) {
  case NodeKind::ELEMENT:
    WriteStartTag(static_cast<const ElementNode &>(node), specials, output);
    break;
  case NodeKind::TEXT:
    output.WriteEscaped(static_cast<const TextNode &>(node).GetValue(), specials.inText);
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
  const Specials &specials = form == CharacterForm::REFERENCES ? SPECIALS_OF_REFERENCES : SPECIALS_OF_UTF8;
  MarkupOutput output(writer);
  const Node *node = this;
  while (node) {
    WriteBegin(*node, specials, output);
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
