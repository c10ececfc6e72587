// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NextInDocumentOrder`, with which fuzz targets visit every node of a tree.

#pragma once

#include <tarvel/xml/node.h>

namespace Fuzz {

/// The node after `node` in document order; null after the last one.
inline const Tarvel::Xml::Node *NextInDocumentOrder(const Tarvel::Xml::Node *node) {
  if (node->GetFirstChild()) {
    return node->GetFirstChild();
  }
  while (node && !node->GetNextSibling()) {
    node = node->GetParent();
  }
  return node ? node->GetNextSibling() : nullptr;
}

} // namespace Fuzz
