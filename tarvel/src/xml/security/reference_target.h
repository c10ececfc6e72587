// SPDX-License-Identifier: Apache-2.0
/// @file
/// From the URI of a reference to the one node that it means.

#pragma once

#include <tarvel/xml/node.h>

#include <cstddef>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// One look through a tree, for the element that has an identifier, and whose reference it is.
struct IdentifierSearch {
  std::string_view identifier;
  std::size_t reference; ///< index of the first of the URIs that name it
  const Node *target = nullptr;
};

/// The searches that `uris` need: one for each identifier, however many of them repeat it, and none for "".
/// @throws XmlSecurityException when an URI is of another kind.
std::vector<IdentifierSearch> PlanSearches(const std::vector<std::string_view> &uris);

/// The targets of `uris`, in their order, in the tree that holds `root`: "" is the document (or topmost element), "#x" the
/// one element with an identifier x in an attribute ID, Id, wsu:Id or xml:id. The tree is walked once, for all of them.
/// An identifier that `root` itself has can therefore mean nothing but `root`.
/// @throws XmlSecurityException when an URI is of another kind, or not exactly one element has the identifier.
std::vector<const Node *> ResolveReferences(const ElementNode &root, const std::vector<std::string_view> &uris);

} // namespace Tarvel::Xml::Security
