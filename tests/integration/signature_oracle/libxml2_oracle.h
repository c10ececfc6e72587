// SPDX-License-Identifier: Apache-2.0
/// @file
/// libxml2's parser and its C14N, to compare canonical forms with.

#pragma once

#include <libxml/tree.h>

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace Testing {

struct XmlDocDeleter {
  void operator()(xmlDoc *document) const noexcept { xmlFreeDoc(document); }
};
using XmlDocHandle = std::unique_ptr<xmlDoc, XmlDocDeleter>;

/// A text in libxml2's type.
inline const xmlChar *XmlText(const char *text) noexcept {
  return reinterpret_cast<const xmlChar *>(text);
}

/// Null when the text is not well-formed. Prints nothing.
XmlDocHandle ParseWithLibxml2(std::string_view text);

/// The element number `index` in document order, from 0; null when there are fewer.
xmlNode *ElementOfLibxml2(xmlDoc &document, std::size_t index);

/// The first element of that local name in document order, or null.
xmlNode *ElementOfLibxml2(xmlDoc &document, std::string_view localName);

/// Whether the document declares a namespace name without a scheme anywhere. Then libxml2 canonicalises no part of the
/// document, not even one without that declaration.
bool HasRelativeNamespaceName(xmlDoc &document);

struct OracleMethod {
  bool isExclusive = false;
  bool withComments = false;
  std::vector<std::string> inclusivePrefixes;
};

/// The canonical form of the subtree at `apex` (null: of the whole document) without the subtree at `omitted` (may be
/// null).
/// @throws std::runtime_error when libxml2 refuses.
std::string CanonicalFormOfLibxml2(xmlDoc &document, const xmlNode *apex, const xmlNode *omitted,
                                   const OracleMethod &method);

} // namespace Testing
