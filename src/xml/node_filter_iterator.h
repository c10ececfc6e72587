// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NodeFilterIterator`, the cursor that all token parsers use, and its filter, which hides comments and white space.

#pragma once

#include <tarvel/xml/node.h>

#include <memory>

namespace SsoClient {

/// Decides at which nodes a cursor stops. Immutable, so any number of threads may use it. Held by a shared pointer that is
/// made from the concrete type, or that owns nothing when the filter outlives the cursors.
///
/// The library has one filter and needs no second. The interface is kept because it is part of the established form of cursors.
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

  /// A cursor at the first visible child.
  NodeFilterIterator GetChild() const;

  const Tarvel::Xml::Node *node; ///< the node at the cursor; null past the end
  std::shared_ptr<const NodeFilter> filter;
};

/// The element at the cursor; null past the end and at a node of another kind.
const Tarvel::Xml::ElementNode *IteratorToElement(const NodeFilterIterator &iterator) noexcept;

} // namespace SsoClient
