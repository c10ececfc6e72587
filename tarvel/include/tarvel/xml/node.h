// SPDX-License-Identifier: Apache-2.0
/// @file
/// The nodes of an XML tree.
///
/// The nodes of a parsed document share one arena of memory, and a node that a factory makes has its own. The
/// `Document`, and every `Ref` to any of the nodes, keep the arena alive. Appending a node to another tree joins the
/// two arenas permanently: each `Ref` to a node of either then keeps both alive. A plain pointer to a node is valid as
/// long as its arena. A tree may be read from any number of threads. It may be changed from one thread while no other
/// thread uses it, or copies or releases a `Ref` to it. Texts are UTF-8; a view of a text in a tree is valid as long as
/// the tree.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/qname.h>

#include <cstdint>
#include <string_view>

namespace Tarvel::Xml {

class DocumentNode;
class ElementNode;
class NodeArena;
class TreeBuilder;

/// How characters beyond ASCII are written.
enum class CharacterForm : std::uint8_t {
  UTF8,      ///< as UTF-8
  REFERENCES ///< in text and attribute values as numeric references (`&#xFC;`), so that a receiver reads them correctly
  ///< whatever encoding it assumes; as UTF-8 in names, comments and processing instructions, where XML has no
  ///< references
};

/// The kind of a node. Each kind has its own class.
enum class NodeKind : std::uint8_t { DOCUMENT, ELEMENT, TEXT, COMMENT, PROCESSING_INSTRUCTION };

/// The base of all nodes. Nodes are made by the factories below and by the parser, never copied.
class TARVEL_API Node {
public:
  Node(const Node &) = delete;
  Node &operator=(const Node &) = delete;

  /// The kind of the node.
  NodeKind GetKind() const noexcept { return m_kind; }

  /// The element or document that the node is a child of, or null.
  const Node *GetParent() const noexcept { return m_parent; }
  Node *GetParent() noexcept { return m_parent; }

  /// The first child, or null.
  const Node *GetFirstChild() const noexcept { return m_firstChild; }
  Node *GetFirstChild() noexcept { return m_firstChild; }
  /// The next child of the same parent, or null.
  const Node *GetNextSibling() const noexcept { return m_nextSibling; }
  Node *GetNextSibling() noexcept { return m_nextSibling; }

  /// The topmost ancestor, or the node itself if it has no parent.
  const Node *GetRoot() const noexcept;

  /// For `Ref`. Both count references to the whole arena.
  void AddRef() const noexcept;
  void Release() const noexcept;

protected:
  Node(NodeKind kind, NodeArena *arena) noexcept : m_arena(arena), m_kind(kind) {}
  ~Node() = default;

  void AppendNode(Node *child) noexcept;
  void PrependNode(Node *child) noexcept;
  void RemoveNode(Node *child) noexcept;

  NodeArena *m_arena;
  Node *m_parent = nullptr;
  Node *m_firstChild = nullptr;
  Node *m_lastChild = nullptr;
  Node *m_nextSibling = nullptr;
  NodeKind m_kind;

  friend class ElementNode;
  friend class NodeArena;
  friend class TreeBuilder;
};

/// Character data; adjacent character data and CDATA sections of a source are one node.
class TARVEL_API TextNode final : public Node {
public:
  /// The text.
  std::string_view GetValue() const noexcept { return m_value; }

  /// @throws InvalidArgumentException when `value` is not UTF-8 or contains a character that XML 1.0 cannot carry.
  void SetValue(std::string_view value);

private:
  explicit TextNode(NodeArena *arena) noexcept : Node(NodeKind::TEXT, arena) {}
  std::string_view m_value;
  friend class NodeArena;
  friend class TreeBuilder;
};

/// A comment.
class TARVEL_API CommentNode final : public Node {
public:
  /// The text between `<!--` and `-->`.
  std::string_view GetValue() const noexcept { return m_value; }

private:
  explicit CommentNode(NodeArena *arena) noexcept : Node(NodeKind::COMMENT, arena) {}
  std::string_view m_value;
  friend class NodeArena;
  friend class TreeBuilder;
};

/// A processing instruction.
class TARVEL_API ProcessingInstructionNode final : public Node {
public:
  /// The target: the name after `<?`.
  std::string_view GetTarget() const noexcept { return m_target; }
  /// The text after the target; may be empty.
  std::string_view GetData() const noexcept { return m_data; }

private:
  explicit ProcessingInstructionNode(NodeArena *arena) noexcept : Node(NodeKind::PROCESSING_INSTRUCTION, arena) {}
  std::string_view m_target;
  std::string_view m_data;
  friend class NodeArena;
  friend class TreeBuilder;
};

/// One attribute of an element, namespace declarations included ("xmlns" and "xmlns:prefix"), in document order.
class TARVEL_API Attribute {
public:
  Attribute(const Attribute &) = delete;
  Attribute &operator=(const Attribute &) = delete;

  /// The name as written, prefix included.
  std::string_view GetName() const noexcept { return m_name; }
  /// The prefix; empty without one.
  std::string_view GetPrefix() const noexcept {
    return m_prefixLength ? m_name.substr(0, m_prefixLength) : std::string_view();
  }
  /// The name without the prefix.
  std::string_view GetLocalName() const noexcept { return m_prefixLength ? m_name.substr(m_prefixLength + 1) : m_name; }
  /// The value, with references and white space replaced (XML 1.0, section 3.3.3).
  std::string_view GetValue() const noexcept { return m_value; }

  /// Whether this is "xmlns" or "xmlns:" followed by a prefix.
  bool IsNamespaceDeclaration() const noexcept { return m_isNamespaceDeclaration; }

  /// The next attribute of the same element, or null.
  const Attribute *GetNext() const noexcept { return m_next; }

private:
  Attribute() noexcept = default;
  std::string_view m_name;
  std::string_view m_value;
  Attribute *m_next = nullptr;
  Attribute *m_nextDeclaration = nullptr; // the element's next namespace declaration
  std::uint32_t m_prefixLength = 0;
  bool m_isNamespaceDeclaration = false;
  friend class ElementNode;
  friend class NodeArena;
  friend class TreeBuilder;
};

/// An element with its attributes and children.
class TARVEL_API ElementNode final : public Node {
public:
  /// The name as written, prefix included.
  std::string_view GetName() const noexcept { return m_name; }
  /// The prefix; empty without one.
  std::string_view GetPrefix() const noexcept {
    return m_prefixLength ? m_name.substr(0, m_prefixLength) : std::string_view();
  }
  /// The name without the prefix.
  std::string_view GetLocalName() const noexcept { return m_prefixLength ? m_name.substr(m_prefixLength + 1) : m_name; }

  /// Where the start tag begins in the source: line and column from 1, the column in bytes; both 0 for an element that
  /// was not parsed.
  std::uint32_t GetLine() const noexcept { return m_line; }
  std::uint32_t GetColumn() const noexcept { return m_column; }

  /// The namespace bound to `prefix` (empty: the default namespace) by the declarations in scope here. Each call
  /// searches again. "xml" and "xmlns" are always bound. Without a declaration, the default namespace counts as bound
  /// to the empty text. A declaration with an empty value unbinds its prefix.
  /// @return whether the prefix is bound; `uri` is written only then.
  bool LookupNamespace(std::string_view prefix, std::string_view &uri) const noexcept;

  /// The element's own qualified name. Its namespace is empty if the prefix is not bound.
  QName GetQName() const;

  /// Whether the element has that local name and its prefix is bound to that namespace.
  bool HasQName(std::string_view namespaceUri, std::string_view localName) const noexcept;

  /// The first attribute, namespace declarations included, or null.
  const Attribute *GetFirstAttribute() const noexcept { return m_firstAttribute; }

  /// The attribute of that qualified name (an empty namespace means: written without a prefix), or null. Namespace
  /// declarations are not found.
  const Attribute *FindAttribute(std::string_view namespaceUri, std::string_view localName) const noexcept;
  const Attribute *FindAttribute(const QName &name) const noexcept;

  /// Reads the attribute's value. @return whether the attribute exists; `value` is written only then.
  bool GetAttribute(const QName &name, std::string_view &value) const noexcept;

  /// The first child element of that qualified name, or null.
  const ElementNode *FindChildElement(const QName &name) const noexcept;
  ElementNode *FindChildElement(const QName &name) noexcept;

  /// The first child element of that local name in any namespace, or null.
  const ElementNode *FindChildElement(std::string_view localName) const noexcept;
  ElementNode *FindChildElement(std::string_view localName) noexcept;

  /// Adds an attribute, or a namespace declaration, of that name as written; an attribute of the same name gets the new
  /// value and keeps its place.
  /// @throws InvalidArgumentException when the name is not a name of XML Namespaces 1.0, or the value is not UTF-8 or
  ///         contains a character that XML 1.0 cannot carry.
  void DefineAttribute(std::string_view qualifiedName, std::string_view value);

  /// Removes the attribute, or the namespace declaration, of that name as written.
  /// @return whether there was one.
  bool RemoveAttribute(std::string_view qualifiedName) noexcept;

  /// Makes `child` the last child. The child of a document, such as its document element, is removed from the document.
  /// @throws InvalidArgumentException when `child` is null, a document, the element itself or its ancestor.
  /// @throws InvalidStateException when `child` already is the child of an element.
  void AppendChild(Node *child);

  /// Makes `child` the first child, by the rules of `AppendChild`, and with its exceptions.
  void PrependChild(Node *child);

  /// Removes `child` from the children. It stays valid as long as its tree, and can be added to an element again.
  /// @return whether it was a child of this element; otherwise nothing changes.
  bool RemoveChild(Node *child) noexcept;

  /// Makes a new element the last child. It is made in the memory of this element's tree, so that it costs no allocation of
  /// its own, and lives as long as the tree.
  /// @throws InvalidArgumentException when prefix or local name is not a name without a colon (NCName).
  ElementNode *AppendElement(std::string_view prefix, std::string_view localName);

  /// Makes a new text node the last child, also in the memory of this element's tree. That memory is wiped when it is freed,
  /// since the text may be secret.
  /// @throws InvalidArgumentException when `value` is not UTF-8 or contains a character that XML 1.0 cannot carry.
  void AppendText(std::string_view value);

  /// Writes the element and all nodes below it as UTF-8 XML, without an XML declaration. In either form, text, attribute
  /// values and line ends are escaped so that parsing makes the same tree. An element without children is written as
  /// "<name></name>".
  void WriteTo(Writer &writer, CharacterForm form = CharacterForm::UTF8) const;

private:
  explicit ElementNode(NodeArena *arena) noexcept : Node(NodeKind::ELEMENT, arena) {}

  /// Where the next attribute, and the next one that is a declaration, are linked.
  struct AttributeEnd {
    Attribute **next;
    Attribute **nextDeclaration;
  };

  // The views passed to both functions must be valid as long as the arena.
  void SetName(std::string_view name) noexcept;
  void AppendAttribute(AttributeEnd &end, std::string_view name, std::size_t prefixLength, std::string_view value);

  /// Checks that `child` may become a child of this element, and removes it from its document.
  void TakeFromDocument(Node *child);

  std::uint32_t m_prefixLength = 0;
  std::string_view m_name;
  Attribute *m_firstAttribute = nullptr;
  Attribute *m_firstDeclaration = nullptr;
  std::uint32_t m_line = 0;
  std::uint32_t m_column = 0;
  friend class NodeArena;
  friend class TreeBuilder;
  friend TARVEL_API void CreateElementNode(std::string_view prefix, std::string_view localName, Ref<ElementNode> &out);
};

/// The root of a parsed document: its children are the document element and the comments and processing instructions
/// around it.
class TARVEL_API DocumentNode final : public Node {
private:
  explicit DocumentNode(NodeArena *arena) noexcept : Node(NodeKind::DOCUMENT, arena) {}
  friend class NodeArena;
  friend class TreeBuilder;
};

/// Checked downcasts; null for null and for a node of another kind.
inline const ElementNode *AsElement(const Node *node) noexcept {
  return node && node->GetKind() == NodeKind::ELEMENT ? static_cast<const ElementNode *>(node) : nullptr;
}
inline ElementNode *AsElement(Node *node) noexcept {
  return node && node->GetKind() == NodeKind::ELEMENT ? static_cast<ElementNode *>(node) : nullptr;
}
inline const TextNode *AsText(const Node *node) noexcept {
  return node && node->GetKind() == NodeKind::TEXT ? static_cast<const TextNode *>(node) : nullptr;
}

/// A new element without a parent, attributes or children.
/// @param prefix may be empty.
/// @throws InvalidArgumentException when prefix or local name is not a name without a colon (NCName).
TARVEL_API void CreateElementNode(std::string_view prefix, std::string_view localName, Ref<ElementNode> &out);

/// A new text node without a parent, with an empty value.
TARVEL_API void CreateTextNode(Ref<TextNode> &out);

} // namespace Tarvel::Xml
