// SPDX-License-Identifier: Apache-2.0

#include "xml/security/canonical_form.h"

#include "xml/reserved_namespaces.h"
#include "xml/security/canonical_output.h"
#include "xml/security/element_place.h"
#include "xml/security/namespace_bindings.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/exceptions.h>

#include <boost/container/small_vector.hpp>

#include <algorithm>
#include <compare>
#include <functional>
#include <tuple>
#include <utility>

namespace Tarvel::Xml::Security {

namespace {

// Attributes are sorted by namespace name, so a long name would be compared many times.
constexpr std::size_t MAX_NAMESPACE_NAME_BYTES = 4096;

constexpr std::string_view INCLUSIVE_WITH_LONE_NUMBER_SIGN = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#";

/// Whether a URI reference begins with a scheme (RFC 3986, section 3.1), that is, is not relative.
bool HasScheme(std::string_view uri) {
  const auto isLetter = [](char c) { return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z'); };
  if (uri.empty() || !isLetter(uri.front())) {
    return false;
  }
  for (const char c : uri) {
    if (c == ':') {
      return true;
    }
    if (!isLetter(c) && !(c >= '0' && c <= '9') && c != '+' && c != '-' && c != '.') {
      return false;
    }
  }
  return false;
}

[[noreturn]] void Refuse(const std::string &what, const ElementNode &element) {
  throw XmlSecurityException("No canonical form: " + what + PlaceOf(element));
}

[[noreturn]] void RefuseUnbound(std::string_view prefix, const ElementNode &element) {
  Refuse("the prefix \"" + StringUtil::Shorten(prefix) + "\" is not bound", element);
}

/// The prefix that a namespace declaration binds; empty for the default namespace.
std::string_view DeclaredPrefix(const Attribute &declaration) {
  return declaration.GetPrefix().empty() ? std::string_view() : declaration.GetLocalName();
}

void RequireDeclarable(std::string_view prefix, std::string_view uri, const ElementNode &element) {
  if (uri.empty() && !prefix.empty()) {
    Refuse("the prefix \"" + StringUtil::Shorten(prefix) + "\" is bound to no namespace", element);
  }
  if (!uri.empty() && !HasScheme(uri)) {
    Refuse("the namespace name \"" + StringUtil::Shorten(uri) + "\" is relative", element);
  }
  if (uri.size() > MAX_NAMESPACE_NAME_BYTES) {
    Refuse("a namespace name is longer than " + std::to_string(MAX_NAMESPACE_NAME_BYTES) + " bytes", element);
  }
  if (prefix == "xmlns" || (prefix == "xml") != (uri == XML_NAMESPACE)) {
    Refuse("the prefix \"" + StringUtil::Shorten(prefix) + "\" is bound to \"" + StringUtil::Shorten(uri) + "\"",
           element);
  }
}

struct CanonicalAttribute {
  std::string_view namespaceUri;
  std::string_view localName;
  const Attribute *attribute;
  std::size_t height; // 0 for the element's own attribute, otherwise the distance to the ancestor that has it

  bool operator<(const CanonicalAttribute &other) const {
    return std::is_lt(std::tie(namespaceUri, localName, height) <=>
                      std::tie(other.namespaceUri, other.localName, other.height));
  }
  bool HasNameOf(const CanonicalAttribute &other) const {
    return localName == other.localName && namespaceUri == other.namespaceUri;
  }
};

/// Walks a subtree once and writes it.
class CanonicalWalk {
public:
  CanonicalWalk(const Node &apex, const CanonicalizationMethod &method, const Node *omitted, Writer &writer)
      : m_apex(apex), m_method(method), m_omitted(omitted), m_output(writer) {}

  void Write();

private:
  void DeclareAncestors();
  void Declare(const ElementNode &element);
  void Open(const Node &node);
  void Close(const Node &node);
  void OpenElement(const ElementNode &element);
  void GatherNamespaces(const ElementNode &element);
  void GatherInclusiveNamespaces(const ElementNode &element);
  void GatherAttributes(const ElementNode &element);
  void GatherInheritedAttributes();
  void WriteNamespaces();
  void WriteAttributes(const ElementNode &element);
  void WriteComment(const CommentNode &comment);
  void WriteProcessingInstruction(const ProcessingInstructionNode &instruction);
  void WriteOutsideDocumentElement(const Node &node, bool before);

  std::size_t FindPrefix(std::string_view prefix, const ElementNode &element) {
    const std::size_t binding = m_bindings.Find(prefix);
    if (binding == NamespaceBindings::NOT_BOUND) {
      RefuseUnbound(prefix, element);
    }
    return binding;
  }
  bool IsInclusivePrefix(std::string_view prefix) const;
  void NeedNamespace(std::size_t binding) {
    if (m_bindings.Write(binding)) {
      m_declarations.push_back(binding);
    }
  }

  const Node &m_apex;
  const CanonicalizationMethod &m_method;
  const Node *const m_omitted;
  CanonicalOutput m_output;
  NamespaceBindings m_bindings;
  // Large enough for a token, which then needs no allocation.
  boost::container::small_vector<NamespaceBindings::Mark, 16> m_openElements;
  boost::container::small_vector<std::size_t, 8> m_declarations;       // of the current element
  boost::container::small_vector<CanonicalAttribute, 16> m_attributes; // of the current element
  bool m_documentElementWritten = false;
};

void CanonicalWalk::Write() {
  DeclareAncestors();
  const Node *node = &m_apex;
  for (;;) {
    if (node != m_omitted) {
      Open(*node);
      if (const Node *child = node->GetFirstChild()) {
        node = child;
        continue;
      }
      Close(*node);
    }
    while (node != &m_apex && !node->GetNextSibling()) {
      node = node->GetParent();
      Close(*node);
    }
    if (node == &m_apex) {
      break;
    }
    node = node->GetNextSibling();
  }
  m_output.Flush();
}

void CanonicalWalk::DeclareAncestors() {
  std::vector<const ElementNode *> ancestors;
  for (const ElementNode *above = AsElement(m_apex.GetParent()); above; above = AsElement(above->GetParent())) {
    ancestors.push_back(above);
  }
  for (auto ancestor = ancestors.rbegin(); ancestor != ancestors.rend(); ++ancestor) {
    Declare(**ancestor);
  }
}

void CanonicalWalk::Declare(const ElementNode &element) {
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    if (attribute->IsNamespaceDeclaration()) {
      const std::string_view prefix = DeclaredPrefix(*attribute);
      RequireDeclarable(prefix, attribute->GetValue(), element);
      m_bindings.Declare(prefix, attribute->GetValue());
    }
  }
}

void CanonicalWalk::Open(const Node &node) {
  switch (node.GetKind()) {
  case NodeKind::ELEMENT:
    OpenElement(static_cast<const ElementNode &>(node));
    return;
  case NodeKind::TEXT:
    m_output.PutText(static_cast<const TextNode &>(node).GetValue());
    return;
  case NodeKind::COMMENT:
    WriteComment(static_cast<const CommentNode &>(node));
    return;
  case NodeKind::PROCESSING_INSTRUCTION:
    WriteProcessingInstruction(static_cast<const ProcessingInstructionNode &>(node));
    return;
  case NodeKind::DOCUMENT:
    return;
  }
}

void CanonicalWalk::Close(const Node &node) {
  const ElementNode *element = AsElement(&node);
  if (!element) {
    return;
  }
  m_output.Put("</", element->GetName(), ">");
  m_bindings.RestoreTo(m_openElements.back());
  m_openElements.pop_back();
  m_documentElementWritten = m_openElements.empty();
}

void CanonicalWalk::OpenElement(const ElementNode &element) {
  m_openElements.push_back(m_bindings.GetMark());
  m_declarations.clear();
  m_attributes.clear();
  if (element.GetFirstAttribute()) {
    Declare(element);
  }
  GatherNamespaces(element);
  GatherAttributes(element);
  if (m_declarations.empty() && m_attributes.empty()) {
    m_output.Put("<", element.GetName(), ">");
    return;
  }
  m_output.Put("<", element.GetName());
  WriteNamespaces();
  WriteAttributes(element);
  m_output.Put(">");
}

void CanonicalWalk::GatherNamespaces(const ElementNode &element) {
  const std::size_t own = FindPrefix(element.GetPrefix(), element);
  if (m_method.isExclusive) {
    NeedNamespace(own);
  }
  if (!m_method.isExclusive || !m_method.inclusivePrefixes.empty()) {
    GatherInclusiveNamespaces(element);
  }
}

// At the apex, every namespace in scope is new to the output. Below it, only those that the element declares are new.
void CanonicalWalk::GatherInclusiveNamespaces(const ElementNode &element) {
  const std::size_t first = &element == &m_apex ? 0 : m_openElements.back().bindings;
  for (std::size_t index = first; index < m_bindings.Size(); ++index) {
    const std::string_view prefix = m_bindings[index].prefix;
    const bool isShadowed = m_bindings.Find(prefix) != index;
    if (!isShadowed && (!m_method.isExclusive || IsInclusivePrefix(prefix))) {
      NeedNamespace(index);
    }
  }
}

void CanonicalWalk::GatherAttributes(const ElementNode &element) {
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    if (attribute->IsNamespaceDeclaration()) {
      continue;
    }
    std::string_view uri;
    if (!attribute->GetPrefix().empty()) {
      const std::size_t binding = FindPrefix(attribute->GetPrefix(), element);
      uri = m_bindings[binding].uri;
      if (m_method.isExclusive) {
        NeedNamespace(binding);
      }
    }
    m_attributes.push_back({uri, attribute->GetLocalName(), attribute, 0});
  }
  if (!m_method.isExclusive && &element == &m_apex) {
    GatherInheritedAttributes();
  }
}

// Canonical XML 1.0, section 2.4: the apex inherits the xml: attributes of its ancestors, the nearest of each name.
void CanonicalWalk::GatherInheritedAttributes() {
  std::size_t height = 0;
  for (const ElementNode *above = AsElement(m_apex.GetParent()); above; above = AsElement(above->GetParent())) {
    ++height;
    for (const Attribute *attribute = above->GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
      if (attribute->GetPrefix() == "xml") {
        m_attributes.push_back({XML_NAMESPACE, attribute->GetLocalName(), attribute, height});
      }
    }
  }
}

void CanonicalWalk::WriteNamespaces() {
  std::sort(m_declarations.begin(), m_declarations.end(),
            [this](std::size_t left, std::size_t right) { return m_bindings[left].prefix < m_bindings[right].prefix; });
  for (const std::size_t index : m_declarations) {
    const NamespaceBindings::Binding &binding = m_bindings[index];
    m_output.Put(binding.prefix.empty() ? " xmlns" : " xmlns:", binding.prefix, "=\"");
    m_output.PutAttributeValue(binding.uri);
    m_output.Put("\"");
  }
}

void CanonicalWalk::WriteAttributes(const ElementNode &element) {
  std::sort(m_attributes.begin(), m_attributes.end());
  const CanonicalAttribute *previous = nullptr;
  for (const CanonicalAttribute &attribute : m_attributes) {
    if (previous && attribute.HasNameOf(*previous)) {
      if (attribute.height == 0) {
        Refuse("the attribute \"" + StringUtil::Shorten(attribute.attribute->GetName()) + "\" occurs twice", element);
      }
      continue; // a nearer one overrides it
    }
    previous = &attribute;
    m_output.Put(" ", attribute.attribute->GetName(), "=\"");
    m_output.PutAttributeValue(attribute.attribute->GetValue());
    m_output.Put("\"");
  }
}

void CanonicalWalk::WriteComment(const CommentNode &comment) {
  if (!m_method.withComments) {
    return;
  }
  WriteOutsideDocumentElement(comment, true);
  m_output.Put("<!--", comment.GetValue(), "-->");
  WriteOutsideDocumentElement(comment, false);
}

void CanonicalWalk::WriteProcessingInstruction(const ProcessingInstructionNode &instruction) {
  WriteOutsideDocumentElement(instruction, true);
  m_output.Put("<?", instruction.GetTarget());
  if (!instruction.GetData().empty()) {
    m_output.Put(" ", instruction.GetData());
  }
  m_output.Put("?>");
  WriteOutsideDocumentElement(instruction, false);
}

// Outside the document element, line feeds separate the nodes: one follows each node before the element, and one
// precedes each node after it.
void CanonicalWalk::WriteOutsideDocumentElement(const Node &node, bool before) {
  const Node *parent = node.GetParent();
  if (parent && parent->GetKind() == NodeKind::DOCUMENT && before == m_documentElementWritten) {
    m_output.Put("\n");
  }
}

bool CanonicalWalk::IsInclusivePrefix(std::string_view prefix) const {
  return std::binary_search(m_method.inclusivePrefixes.begin(), m_method.inclusivePrefixes.end(), prefix,
                            std::less<>());
}

} // namespace

bool FindCanonicalizationMethod(std::string_view algorithmUri, CanonicalizationMethod &method) {
  const bool isExclusive =
      algorithmUri == CanonicalizationUri::EXCLUSIVE || algorithmUri == CanonicalizationUri::EXCLUSIVE_WITH_COMMENTS;
  const bool withComments = algorithmUri == CanonicalizationUri::INCLUSIVE_WITH_COMMENTS ||
                            algorithmUri == CanonicalizationUri::EXCLUSIVE_WITH_COMMENTS;
  if (!isExclusive && !withComments && algorithmUri != CanonicalizationUri::INCLUSIVE &&
      algorithmUri != INCLUSIVE_WITH_LONE_NUMBER_SIGN) {
    return false;
  }
  method = CanonicalizationMethod{isExclusive, withComments, {}};
  return true;
}

void SetInclusivePrefixes(CanonicalizationMethod &method, std::vector<std::string> prefixList) {
  std::replace(prefixList.begin(), prefixList.end(), std::string("#default"), std::string());
  std::sort(prefixList.begin(), prefixList.end());
  method.inclusivePrefixes = std::move(prefixList);
}

void WriteCanonicalForm(const Node &apex, const CanonicalizationMethod &method, const Node *omitted, Writer &writer) {
  CanonicalWalk(apex, method, omitted, writer).Write();
}

} // namespace Tarvel::Xml::Security
