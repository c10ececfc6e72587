// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NextInTree`, the step of a walk over a tree in document order.

#pragma once

#include <tarvel/xml/node.h>

namespace SsoClient {

/// The node after `node` in document order, if it is below `top`; otherwise null. A walk begins at `top` itself. It needs no
/// recursion, so the depth of a tree does not matter.
/// @param enters whether the children of `node` are part of the walk
inline const Tarvel::Xml::Node *NextInTree(const Tarvel::Xml::Node *node, const Tarvel::Xml::Node *top,
                                           bool enters = true) noexcept {
  if (enters && node->GetFirstChild()) {
    return node->GetFirstChild();
  }
  while (node != top && !node->GetNextSibling()) {
    node = node->GetParent();
  }
  return node == top ? nullptr : node->GetNextSibling();
}

} // namespace SsoClient
