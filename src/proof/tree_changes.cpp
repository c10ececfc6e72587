// SPDX-License-Identifier: Apache-2.0

#include "proof/tree_changes.h"

#include <cstddef>

namespace SsoClient {

namespace {

using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;

const Attribute *LastAttribute(const ElementNode &element) noexcept {
  const Attribute *last = element.GetFirstAttribute();
  while (last && last->GetNext()) {
    last = last->GetNext();
  }
  return last;
}

} // namespace

TreeChanges::~TreeChanges() {
  for (std::size_t index = m_children.size(); index > 0; --index) {
    const AddedChild &added = m_children[index - 1];
    added.parent->RemoveChild(added.child.get());
  }
  for (const AddedAttributes &added : m_attributes) {
    const Attribute *first = added.last ? added.last->GetNext() : added.element->GetFirstAttribute();
    while (first) {
      added.element->RemoveAttribute(first->GetName());
      first = added.last ? added.last->GetNext() : added.element->GetFirstAttribute();
    }
  }
}

void TreeChanges::Prepend(ElementNode &parent, const Tarvel::Ref<ElementNode> &child) {
  m_children.push_back({&parent, child});
  parent.PrependChild(child.get());
}

void TreeChanges::ExpectAttributes(ElementNode &element) {
  m_attributes.push_back({&element, LastAttribute(element)});
}

void TreeChanges::Keep() noexcept {
  m_children.clear();
  m_attributes.clear();
}

} // namespace SsoClient
