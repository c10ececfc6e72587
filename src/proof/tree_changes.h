// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TreeChanges`, changes of a tree that are undone unless they are kept.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/xml/node.h>

#include <vector>

namespace SsoClient {

/// Records changes of a tree. When it is destroyed, it undoes them, unless `Keep` was called. So a function that fails
/// in the middle leaves the tree of its caller as it was.
class TreeChanges {
public:
  TreeChanges() = default;
  TreeChanges(const TreeChanges &) = delete;
  TreeChanges &operator=(const TreeChanges &) = delete;
  ~TreeChanges();

  /// Makes `child` the first child of `parent`, which was in the tree before or has been added by this function.
  void Prepend(Tarvel::Xml::ElementNode &parent, const Tarvel::Ref<Tarvel::Xml::ElementNode> &child);

  /// Records that attributes will be added to `element`, after those that it has now.
  void ExpectAttributes(Tarvel::Xml::ElementNode &element);

  /// The changes stay.
  void Keep() noexcept;

private:
  struct AddedChild {
    Tarvel::Xml::ElementNode *parent;
    Tarvel::Ref<Tarvel::Xml::ElementNode> child;
  };
  struct AddedAttributes {
    Tarvel::Xml::ElementNode *element;
    const Tarvel::Xml::Attribute *last; ///< the last one before; null if there was none
  };

  std::vector<AddedChild> m_children;
  std::vector<AddedAttributes> m_attributes;
};

} // namespace SsoClient
