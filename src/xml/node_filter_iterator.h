// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NodeFilterIterator`, the cursor with which every parser walks a tree, and the filter that hides what means nothing.

#pragma once

#include <tarvel/xml/node.h>

#include <memory>

namespace SsoClient {

/// Decides on which nodes a cursor may stop. Immutable; safe on any thread. Held by a shared pointer that is made from
/// the concrete type, or that owns nothing when the filter outlives the cursors.
class NodeFilter {
public:
  virtual bool Accept(const Tarvel::Xml::Node &node) const = 0;

protected:
  NodeFilter() = default;
  NodeFilter(const NodeFilter &) = default;
  NodeFilter &operator=(const NodeFilter &) = default;
  ~NodeFilter() = default;
};

/// Hides comments, and text of nothing but XML white space. Everything else is shown: an unknown kind of node must not
/// slip past the strict checks.
class SkipWsAndCommentsFilter final : public NodeFilter {
public:
  bool Accept(const Tarvel::Xml::Node &node) const override;
};

/// A place among the children of an element. A copy moves on its own. The tree must outlive the cursor.
class NodeFilterIterator {
public:
  /// Stands on `node`, whatever the filter says about it.
  NodeFilterIterator(const Tarvel::Xml::Node *node, std::shared_ptr<const NodeFilter> filter);

  /// Moves to the next accepted sibling, or off the end; a cursor that is off the end stays there.
  NodeFilterIterator &MoveToSibling();

  /// Moves to the first accepted child, or off the end.
  NodeFilterIterator &MoveToChild();

  /// A cursor on the first accepted child.
  NodeFilterIterator GetChild() const;

  const Tarvel::Xml::Node *node; ///< where the cursor stands; null off the end
  std::shared_ptr<const NodeFilter> filter;
};

/// The element that the cursor stands on; null off the end and on a node of another kind.
const Tarvel::Xml::ElementNode *IteratorToElement(const NodeFilterIterator &iterator) noexcept;

} // namespace SsoClient
