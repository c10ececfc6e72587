// SPDX-License-Identifier: Apache-2.0

#include "xml/node_filter_iterator.h"

#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Xml::Node;
using Tarvel::Xml::NodeKind;

constexpr std::string_view WHITE_SPACE = "\t\n\r ";

} // namespace

bool SkipWsAndCommentsFilter::Accept(const Node &node) const {
  switch (node.GetKind()) {
  case NodeKind::TEXT:
    return Tarvel::Xml::AsText(&node)->GetValue().find_first_not_of(WHITE_SPACE) != std::string_view::npos;
  case NodeKind::COMMENT:
    return false;
  default:
    return true;
  }
}

NodeFilterIterator::NodeFilterIterator(const Node *startNode, std::shared_ptr<const NodeFilter> nodeFilter)
    : node(startNode), filter(std::move(nodeFilter)), parent(startNode ? startNode->GetParent() : nullptr) {}

NodeFilterIterator &NodeFilterIterator::MoveToSibling() {
  while (node) {
    node = node->GetNextSibling();
    if (node && filter->Accept(*node)) {
      break;
    }
  }
  return *this;
}

NodeFilterIterator &NodeFilterIterator::MoveToChild() {
  parent = node;
  node = node ? node->GetFirstChild() : nullptr;
  if (node && !filter->Accept(*node)) {
    MoveToSibling();
  }
  return *this;
}

NodeFilterIterator NodeFilterIterator::GetChild() const {
  NodeFilterIterator child = *this;
  child.MoveToChild();
  return child;
}

} // namespace SsoClient
