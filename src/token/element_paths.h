// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ElementPaths`, which describe the places of elements in their document.

#pragma once

#include <tarvel/xml/node.h>

#include <cstddef>
#include <string>
#include <unordered_map>

namespace SsoClient {

/// Makes paths such as "/saml2:Assertion/saml2:Subject", from the topmost element to an element: the names as they are
/// written, and "[n]" after the name of an element that is the n-th of that name under its parent, if n > 1.
///
/// A path takes bounded time and memory in every document. If more than `MAX_SIBLINGS` nodes are before an element,
/// "[?]" is written after its name. If the path of its parent is longer than `MAX_PARENT_BYTES`, "/..." is written
/// instead of that path. The paths of parents are kept for later calls. A path contains the sender's names, so it need
/// not be printable. The tree must outlive this object, and must not be changed.
class ElementPaths {
public:
  static constexpr unsigned MAX_SIBLINGS = 1000;
  static constexpr std::size_t MAX_PARENT_BYTES = 512;

  std::string Of(const Tarvel::Xml::ElementNode &element);

private:
  std::unordered_map<const Tarvel::Xml::ElementNode *, std::string> m_parents;
};

} // namespace SsoClient
