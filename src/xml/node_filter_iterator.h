// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NodeFilterIterator`, the cursor that all token parsers use, and its filter, which hides comments and white space.

#pragma once

#include <tarvel/xml/node.h>

#include <memory>

namespace SsoClient {

/// Decides at which nodes a cursor stops. Immutable, so any number of threads may use it. A shared pointer to a filter
/// must be made from the concrete class, because the destructor is protected. The pointer may own nothing when the
/// filter outlives the cursors.
///
/// The library has only one filter. The interface stays because the established form of cursors includes it.
class NodeFilter {
public:
  virtual bool Accept(const Tarvel::Xml::Node &node) const = 0;

protected:
  NodeFilter() = default;
  NodeFilter(const NodeFilter &) = default;
  NodeFilter &operator=(const NodeFilter &) = default;
  ~NodeFilter() = default;
};

/// Hides comments, and texts that consist of XML white space. All other nodes are visible: an unknown kind of node must reach
/// the strict checks.
class SkipWsAndCommentsFilter final : public NodeFilter {
public:
  bool Accept(const Tarvel::Xml::Node &node) const override;
};

/// A position among the children of an element. Copies move independently. The tree must outlive the cursor.
class NodeFilterIterator {
public:
  /// Starts at `node`, even if the filter hides it.
  NodeFilterIterator(const Tarvel::Xml::Node *node, std::shared_ptr<const NodeFilter> filter);

  /// Moves to the next visible sibling, or past the end. A cursor past the end stays there.
  NodeFilterIterator &MoveToSibling();

  /// Moves to the first visible child, or past the end.
  NodeFilterIterator &MoveToChild();

  /// A cursor at the first visible child, or past the end.
  NodeFilterIterator GetChild() const;

  const Tarvel::Xml::Node *node; ///< the node at the cursor; null past the end
  std::shared_ptr<const NodeFilter> filter;
  const Tarvel::Xml::Node
      *parent; ///< the parent of the nodes over which the cursor moves, also past their end; may be null
};

/// The element at the cursor; null past the end and at a node of another kind.
inline const Tarvel::Xml::ElementNode *IteratorToElement(const NodeFilterIterator &iterator) noexcept {
  return Tarvel::Xml::AsElement(iterator.node);
}

} // namespace SsoClient
