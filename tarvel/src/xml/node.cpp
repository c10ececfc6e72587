// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/node.h>

#include "xml/characters.h"
#include "xml/node_arena.h"
#include "xml/reserved_namespaces.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <algorithm>
#include <string>
#include <utility>

namespace Tarvel::Xml {

namespace {

// Enough for most nodes of a composed message: an element with a few attributes, a short text.
constexpr std::size_t ELEMENT_ARENA_BYTES = 512;
constexpr std::size_t TEXT_ARENA_BYTES = 192;

void RequireXmlText(std::string_view what, std::string_view text) {
  const std::string refusal = DescribeForbiddenCharacter(what, text);
  if (!refusal.empty()) {
    throw InvalidArgumentException(refusal);
  }
}

void RequireNcName(std::string_view what, std::string_view name) {
  if (!IsNcName(name)) {
    throw InvalidArgumentException(std::string(what) + " '" + StringUtil::Shorten(name) +
                                   "' is not an XML name without a colon");
  }
}

void RequireElementName(std::string_view prefix, std::string_view localName) {
  if (!prefix.empty()) {
    RequireNcName("the prefix", prefix);
  }
  RequireNcName("the local name", localName);
}

/// The prefix that a namespace declaration binds; empty for the default namespace.
std::string_view GetDeclaredPrefix(const Attribute &declaration) noexcept {
  return declaration.GetPrefix().empty() ? std::string_view() : declaration.GetLocalName();
}

} // namespace

const Node *Node::GetRoot() const noexcept {
  const Node *node = this;
  while (node->m_parent) {
    node = node->m_parent;
  }
  return node;
}

void Node::AddRef() const noexcept {
  m_arena->AddRef();
}

void Node::Release() const noexcept {
  m_arena->Release();
}

void Node::AppendNode(Node *child) noexcept {
  child->m_parent = this;
  (m_lastChild ? m_lastChild->m_nextSibling : m_firstChild) = child;
  m_lastChild = child;
}

void Node::PrependNode(Node *child) noexcept {
  child->m_parent = this;
  child->m_nextSibling = m_firstChild;
  m_firstChild = child;
  m_lastChild = m_lastChild ? m_lastChild : child;
}

void Node::RemoveNode(Node *child) noexcept {
  Node *previous = nullptr;
  for (Node *node = m_firstChild; node != child; node = node->m_nextSibling) {
    previous = node;
  }
  (previous ? previous->m_nextSibling : m_firstChild) = child->m_nextSibling;
  if (m_lastChild == child) {
    m_lastChild = previous;
  }
  child->m_parent = nullptr;
  child->m_nextSibling = nullptr;
}

void TextNode::SetValue(std::string_view value) {
  RequireXmlText("the text", value);
  m_value = m_arena->Copy(value);
}

bool ElementNode::LookupNamespace(std::string_view prefix, std::string_view &uri) const noexcept {
  if (prefix == "xml" || prefix == "xmlns") {
    uri = prefix == "xml" ? XML_NAMESPACE : XMLNS_NAMESPACE;
    return true;
  }
  for (const ElementNode *element = this; element; element = AsElement(element->GetParent())) {
    for (const Attribute *declaration = element->m_firstDeclaration; declaration;
         declaration = declaration->m_nextDeclaration) {
      if (GetDeclaredPrefix(*declaration) != prefix) {
        continue;
      }
      if (declaration->GetValue().empty() && !prefix.empty()) {
        return false;
      }
      uri = declaration->GetValue();
      return true;
    }
  }
  if (!prefix.empty()) {
    return false;
  }
  uri = std::string_view();
  return true;
}

QName ElementNode::GetQName() const {
  std::string_view uri;
  LookupNamespace(GetPrefix(), uri);
  return QName(std::string(uri), std::string(GetLocalName()));
}

bool ElementNode::HasQName(std::string_view namespaceUri, std::string_view localName) const noexcept {
  std::string_view uri;
  return GetLocalName() == localName && LookupNamespace(GetPrefix(), uri) && uri == namespaceUri;
}

const Attribute *ElementNode::FindAttribute(std::string_view namespaceUri, std::string_view localName) const noexcept {
  for (const Attribute *attribute = m_firstAttribute; attribute; attribute = attribute->m_next) {
    if (attribute->m_isNamespaceDeclaration || attribute->GetLocalName() != localName ||
        attribute->GetPrefix().empty() != namespaceUri.empty()) {
      continue;
    }
    std::string_view uri;
    if (namespaceUri.empty() || (LookupNamespace(attribute->GetPrefix(), uri) && uri == namespaceUri)) {
      return attribute;
    }
  }
  return nullptr;
}

const Attribute *ElementNode::FindAttribute(const QName &name) const noexcept {
  return FindAttribute(name.namespaceUri, name.localName);
}

bool ElementNode::GetAttribute(const QName &name, std::string_view &value) const noexcept {
  const Attribute *const attribute = FindAttribute(name);
  if (!attribute) {
    return false;
  }
  value = attribute->GetValue();
  return true;
}

const ElementNode *ElementNode::FindChildElement(const QName &name) const noexcept {
  for (const Node *node = m_firstChild; node; node = node->GetNextSibling()) {
    const ElementNode *const element = AsElement(node);
    if (element && element->HasQName(name.namespaceUri, name.localName)) {
      return element;
    }
  }
  return nullptr;
}

ElementNode *ElementNode::FindChildElement(const QName &name) noexcept {
  return const_cast<ElementNode *>(static_cast<const ElementNode *>(this)->FindChildElement(name));
}

const ElementNode *ElementNode::FindChildElement(std::string_view localName) const noexcept {
  for (const Node *node = m_firstChild; node; node = node->GetNextSibling()) {
    const ElementNode *const element = AsElement(node);
    if (element && element->GetLocalName() == localName) {
      return element;
    }
  }
  return nullptr;
}

ElementNode *ElementNode::FindChildElement(std::string_view localName) noexcept {
  return const_cast<ElementNode *>(static_cast<const ElementNode *>(this)->FindChildElement(localName));
}

void ElementNode::DefineAttribute(std::string_view qualifiedName, std::string_view value) {
  const std::size_t colon = qualifiedName.find(':');
  const bool hasPrefix = colon != std::string_view::npos;
  if ((hasPrefix && !IsNcName(qualifiedName.substr(0, colon))) ||
      !IsNcName(hasPrefix ? qualifiedName.substr(colon + 1) : qualifiedName)) {
    throw InvalidArgumentException("the attribute name '" + StringUtil::Shorten(qualifiedName) +
                                   "' is not a qualified XML name");
  }
  const std::string refusal = DescribeForbiddenCharacter("", value);
  if (!refusal.empty()) {
    throw InvalidArgumentException("the value of the attribute '" + StringUtil::Shorten(qualifiedName) + "'" + refusal);
  }
  AttributeEnd end{&m_firstAttribute, &m_firstDeclaration};
  for (; *end.next; end.next = &(*end.next)->m_next) {
    Attribute &attribute = **end.next;
    if (attribute.m_name == qualifiedName) {
      attribute.m_value = m_arena->Copy(value);
      return;
    }
    if (attribute.m_isNamespaceDeclaration) {
      end.nextDeclaration = &attribute.m_nextDeclaration;
    }
  }
  const std::string_view name = m_arena->Copy(qualifiedName);
  AppendAttribute(end, name, hasPrefix ? colon : 0, m_arena->Copy(value));
}

bool ElementNode::RemoveAttribute(std::string_view qualifiedName) noexcept {
  Attribute **nextDeclaration = &m_firstDeclaration;
  for (Attribute **next = &m_firstAttribute; *next; next = &(*next)->m_next) {
    Attribute &attribute = **next;
    if (attribute.m_name == qualifiedName) {
      if (attribute.m_isNamespaceDeclaration) {
        *nextDeclaration = attribute.m_nextDeclaration;
      }
      *next = attribute.m_next;
      return true;
    }
    if (attribute.m_isNamespaceDeclaration) {
      nextDeclaration = &attribute.m_nextDeclaration;
    }
  }
  return false;
}

ElementNode *ElementNode::AppendElement(std::string_view prefix, std::string_view localName) {
  RequireElementName(prefix, localName);
  ElementNode *const child = m_arena->New<ElementNode>(m_arena);
  child->SetName(m_arena->CopyQualifiedName(prefix, localName));
  AppendNode(child);
  return child;
}

void ElementNode::AppendText(std::string_view value) {
  m_arena->WipeAfterUse();
  TextNode *const text = m_arena->New<TextNode>(m_arena);
  text->SetValue(value);
  AppendNode(text);
}

void ElementNode::SetName(std::string_view name) noexcept {
  const auto colon = std::find(name.begin(), name.end(), ':');
  m_name = name;
  m_prefixLength = colon == name.end() ? 0 : static_cast<std::uint32_t>(colon - name.begin());
}

void ElementNode::AppendAttribute(AttributeEnd &end, std::string_view name, std::size_t prefixLength,
                                  std::string_view value) {
  Attribute *const attribute = m_arena->New<Attribute>();
  attribute->m_name = name;
  attribute->m_value = value;
  attribute->m_prefixLength = static_cast<std::uint32_t>(prefixLength);
  attribute->m_isNamespaceDeclaration = (prefixLength ? name.substr(0, prefixLength) : name) == "xmlns";
  *end.next = attribute;
  end.next = &attribute->m_next;
  if (attribute->m_isNamespaceDeclaration) {
    *end.nextDeclaration = attribute;
    end.nextDeclaration = &attribute->m_nextDeclaration;
  }
}

void ElementNode::TakeFromDocument(Node *child) {
  if (!child || child->GetKind() == NodeKind::DOCUMENT) {
    throw InvalidArgumentException(child ? "a document cannot be a child" : "the child is null");
  }
  // A node whose arena is not joined with this one's cannot be an ancestor.
  if (NodeArena::AreJoined(m_arena, child->m_arena)) {
    for (const Node *node = this; node; node = node->GetParent()) {
      if (node == child) {
        throw InvalidArgumentException("an element cannot be a child of itself or of a node below it");
      }
    }
  }
  if (child->m_parent && child->m_parent->GetKind() == NodeKind::ELEMENT) {
    throw InvalidStateException("the node already is the child of an element");
  }
  if (child->m_parent) {
    child->m_parent->RemoveNode(child);
  }
}

void ElementNode::AppendChild(Node *child) {
  TakeFromDocument(child);
  AppendNode(child);
  NodeArena::Join(m_arena, child->m_arena);
}

void ElementNode::PrependChild(Node *child) {
  TakeFromDocument(child);
  PrependNode(child);
  NodeArena::Join(m_arena, child->m_arena);
}

bool ElementNode::RemoveChild(Node *child) noexcept {
  const bool isChild = child && child->m_parent == this;
  if (isChild) {
    RemoveNode(child);
  }
  return isChild;
}

void CreateElementNode(std::string_view prefix, std::string_view localName, Ref<ElementNode> &out) {
  RequireElementName(prefix, localName);
  NodeArena *const arena = NodeArena::Create(ELEMENT_ARENA_BYTES);
  Ref<ElementNode> element(arena->New<ElementNode>(arena));
  element->SetName(arena->CopyQualifiedName(prefix, localName));
  out = std::move(element);
}

void CreateTextNode(Ref<TextNode> &out) {
  // A text that a program composes, unlike one that was parsed, may be a password.
  NodeArena *const arena = NodeArena::Create(TEXT_ARENA_BYTES, NodeArena::AfterUse::WIPE_AND_FREE);
  out = Ref<TextNode>(arena->New<TextNode>(arena));
}

} // namespace Tarvel::Xml
