// SPDX-License-Identifier: Apache-2.0

#include "token/element_paths.h"

#include <vector>

namespace SsoClient {

namespace {

using Tarvel::Xml::AsElement;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

/// The position of `element` among the elements of its name under its parent, from 1; 0 if it is too far from the first
/// child.
unsigned PositionOf(const ElementNode &element) {
  const Node *const parent = element.GetParent();
  unsigned position = 1;
  unsigned siblings = 0;
  for (const Node *node = parent ? parent->GetFirstChild() : &element; node != &element;
       node = node->GetNextSibling()) {
    if (++siblings > ElementPaths::MAX_SIBLINGS) {
      return 0;
    }
    const ElementNode *const sibling = AsElement(node);
    position += sibling && sibling->GetName() == element.GetName() ? 1U : 0U;
  }
  return position;
}

void AppendStep(const ElementNode &element, std::string &path) {
  path.append("/").append(element.GetName());
  const unsigned position = PositionOf(element);
  if (position == 0) {
    path += "[?]";
  } else if (position > 1) {
    path.append("[").append(std::to_string(position)).append("]");
  }
}

} // namespace

std::string ElementPaths::Of(const ElementNode &element) {
  std::vector<const ElementNode *> steps{&element};
  const ElementNode *parent = AsElement(element.GetParent());
  for (; parent && m_parents.count(parent) == 0; parent = AsElement(parent->GetParent())) {
    steps.push_back(parent);
  }
  std::string path = parent ? m_parents[parent] : std::string();
  for (; steps.size() > 1; steps.pop_back()) {
    AppendStep(*steps.back(), path);
    if (path.size() > MAX_PARENT_BYTES) {
      path = "/...";
    }
    m_parents[steps.back()] = path;
  }
  AppendStep(element, path);
  return path;
}

} // namespace SsoClient
