// SPDX-License-Identifier: Apache-2.0
/// @file
/// Resolving the URI of a reference to the one node that it refers to.

#pragma once

#include "xml/security/refusal_sink.h"

#include <tarvel/xml/node.h>

#include <cstddef>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// The URI of a reference, and the element that has it, which may be null.
struct ReferenceUri {
  std::string_view uri;
  const ElementNode *element = nullptr;
};

/// A search in a tree for the element that has an identifier.
struct IdentifierSearch {
  std::string_view identifier;
  std::size_t reference; ///< index of the first URI with that identifier
  const Node *target = nullptr;
  bool isAmbiguous = false; ///< several elements have the identifier
};

/// The searches that `uris` need: one for each different identifier, and none for "". `sink` receives once each
/// different URI that is neither "" nor "#x".
std::vector<IdentifierSearch> PlanSearches(const std::vector<ReferenceUri> &uris, RefusalSink &sink = ThrowingSink());

/// The targets of `uris`, in their order, in the tree that contains `root`: "" is the document (or topmost element), "#x"
/// the one element with an identifier x in an attribute ID, Id, wsu:Id or xml:id. So the identifier of `root` cannot
/// refer to another element. The tree is walked once for all references. If a URI is neither "" nor "#x", or no element
/// or more than one has the identifier, the target is null, and `sink` receives one refusal for each different URI.
std::vector<const Node *> ResolveReferences(const ElementNode &root, const std::vector<ReferenceUri> &uris,
                                            RefusalSink &sink = ThrowingSink());

} // namespace Tarvel::Xml::Security
