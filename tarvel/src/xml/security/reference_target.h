// SPDX-License-Identifier: Apache-2.0
/// @file
/// From the URI of a reference to the one node that it means.

#pragma once

#include <tarvel/xml/node.h>

#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// The targets of `uris`, in their order, in the tree that holds `root`: "" is the document (or topmost element), "#x" the
/// one element with an identifier x in an attribute ID, Id, wsu:Id or xml:id. The tree is walked once, for all of them.
/// When `root` has the identifier itself, it must be what is found.
/// @throws XmlSecurityException when an URI is of another kind, or not exactly one element has the identifier.
std::vector<const Node *> ResolveReferences(const ElementNode &root, const std::vector<std::string_view> &uris);

} // namespace Tarvel::Xml::Security
