// SPDX-License-Identifier: Apache-2.0

#include "document_writer.h"

#include "markup_writer.h"
#include "xml_pieces.h"

#include <algorithm>
#include <cstddef>
#include <string_view>
#include <vector>

namespace Testing {

namespace {

constexpr std::size_t MAX_DEPTH = 5;
constexpr std::size_t MAX_ELEMENTS = 10;

class DocumentWriter {
public:
  explicit DocumentWriter(RandomSource &random) : m_random(random), m_writer(random) {}

  std::string Write() {
    if (m_random.OnceIn(12)) {
      m_writer.Put(m_random.OnceIn(3) ? m_random.OneOf(MARKS) : MARKS[0]);
    }
    if (m_random.OnceIn(3)) {
      m_writer.PutDeclaration();
    }
    m_writer.PutOutside();
    PutElement(1);
    m_writer.PutOutside();
    if (m_writer.IsOdd()) {
      m_writer.Put(m_random.OnceIn(2) ? "text" : "<again/>");
    }
    return m_writer.Take();
  }

private:
  std::string Prefix() {
    return std::string(m_writer.IsNarrow() ? PREFIXES[m_random.Below(3)] : m_random.OneOf(PREFIXES));
  }

  std::string QualifiedName() {
    if (m_writer.IsNarrow() && m_random.OnceIn(2)) {
      return Prefix() + ":" + m_writer.Name();
    }
    if (m_random.OnceIn(3) && !m_declared.empty()) {
      return m_declared[m_random.Below(m_declared.size())] + ":" + m_writer.Name();
    }
    return m_random.OnceIn(40) ? Prefix() + ":" + m_writer.Name() : m_writer.Name();
  }

  struct WrittenAttribute {
    std::string name;
    std::string value;
  };

  void AddDeclarations(std::vector<WrittenAttribute> &attributes) {
    for (std::size_t count = m_random.OnceIn(2) ? 0 : m_random.Below(4); count != 0; --count) {
      const std::string prefix = m_random.OnceIn(4) ? "" : Prefix();
      const bool isOddName = m_writer.IsOdd() || m_random.OnceIn(16);
      if (Add(prefix.empty() ? "xmlns" : "xmlns:" + prefix,
              isOddName             ? m_random.OneOf(ODD_NAMESPACES)
              : m_writer.IsNarrow() ? NAMESPACES[m_random.Below(2)]
                                    : m_random.OneOf(NAMESPACES),
              attributes) &&
          !prefix.empty()) {
        m_declared.push_back(prefix);
      }
    }
  }

  void AddAttributes(std::vector<WrittenAttribute> &attributes) {
    for (std::size_t count = m_random.Below(m_random.OnceIn(20) ? 24 : 4); count != 0; --count) {
      Add(QualifiedName(), m_writer.AttributeValue(), attributes);
    }
    if (m_random.OnceIn(30)) {
      Add("xmlns:xml", "http://www.w3.org/XML/1998/namespace", attributes);
    }
  }

  /// Adds an attribute; only rarely one whose name exists already.
  bool Add(const std::string &name, std::string_view value, std::vector<WrittenAttribute> &attributes) {
    const bool isTwice = std::any_of(attributes.begin(), attributes.end(),
                                     [&](const WrittenAttribute &other) { return other.name == name; });
    if (isTwice && !m_writer.IsOdd()) {
      return false;
    }
    const auto place = static_cast<std::ptrdiff_t>(m_random.Below(attributes.size() + 1));
    attributes.insert(attributes.begin() + place, {name, std::string(value)});
    return true;
  }

  /// @return the name.
  std::string PutStartTag() {
    std::vector<WrittenAttribute> attributes;
    AddDeclarations(attributes);
    std::string name = QualifiedName();
    AddAttributes(attributes);
    m_writer.Put("<" + name);
    for (const WrittenAttribute &attribute : attributes) {
      m_writer.PutAttribute(attribute.name, attribute.value);
    }
    if (m_random.OnceIn(12)) {
      m_writer.Put(m_random.OneOf(XML_ATTRIBUTES));
    }
    m_writer.PutOptionalSpace();
    return name;
  }

  // The depth is bounded by MAX_DEPTH.
  void PutElement(std::size_t depth) {
    ++m_elements;
    const std::size_t outside = m_declared.size();
    const std::string name = PutStartTag();
    if (m_random.OnceIn(4)) {
      m_writer.Put(m_writer.IsOdd() ? "/ >" : "/>");
      m_declared.resize(outside);
      return;
    }
    m_writer.Put(">");
    for (std::size_t count = m_random.Below(5); count != 0; --count) {
      PutContent(depth);
    }
    m_writer.Put("</" + (m_writer.IsOdd() ? m_writer.Name() : name));
    m_writer.PutOptionalSpace();
    m_writer.Put(m_writer.IsOdd() ? " a='1'>" : ">");
    m_declared.resize(outside);
  }

  void PutContent(std::size_t depth) {
    switch (m_random.Below(9)) {
    case 0:
      return m_writer.PutCData();
    case 1:
      return m_writer.PutComment();
    case 2:
      return m_writer.PutInstruction();
    case 3:
    case 4:
    case 5:
      return m_writer.PutText();
    default:
      if (depth < MAX_DEPTH && m_elements < MAX_ELEMENTS) {
        PutElement(depth + 1);
      }
    }
  }

  RandomSource &m_random;
  MarkupWriter m_writer;
  std::size_t m_elements = 0;
  std::vector<std::string> m_declared; // prefixes in scope
};

} // namespace

std::string WriteDocument(RandomSource &random) {
  return DocumentWriter(random).Write();
}

} // namespace Testing
