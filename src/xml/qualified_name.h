// SPDX-License-Identifier: Apache-2.0
/// @file
/// Qualified names: the names of elements, and names in the text of attributes.

#pragma once

#include "model/namespaces.h"

#include <tarvel/xml/node.h>
#include <tarvel/xml/qname.h>

#include <string>
#include <string_view>

namespace SsoClient {

/// A qualified name that does not own its texts, so that names can be compared without being copied.
struct QNameView {
  std::string_view namespaceUri; ///< empty for a name in no namespace
  std::string_view localName;

  constexpr QNameView(std::string_view uri, std::string_view local) noexcept : namespaceUri(uri), localName(local) {}
  QNameView(const Tarvel::Xml::QName &name) noexcept : QNameView(name.namespaceUri, name.localName) {}

  friend bool operator==(const QNameView &, const QNameView &) = default;

  /// The same text as that of a `QName`.
  std::string ToString() const;
};

/// `name` in no namespace: the name of an attribute without a prefix.
constexpr QNameView LocalName(std::string_view name) noexcept {
  return {std::string_view(), name};
}

/// The name of the attribute that states the type of an element.
constexpr QNameView XSI_TYPE(Namespaces::XSI, "type");

/// Reads a name with or without prefix. Prefixes are resolved by the namespace declarations in scope at `element`; the
/// first colon ends the prefix. A name without a colon is in `defaultNamespace`.
/// @return a view into `text`, into the tree and into `defaultNamespace`.
/// @throws ParseException when the prefix is not bound.
QNameView ResolveQName(const Tarvel::Xml::ElementNode &element, std::string_view text,
                       std::string_view defaultNamespace);

/// The same, but the result owns its texts.
/// @param name set on success only.
void ResolveQName(const Tarvel::Xml::ElementNode &element, std::string_view text, std::string_view defaultNamespace,
                  Tarvel::Xml::QName &name);

/// Whether `element` is not null, has that local name, and is in that namespace. An element without a
/// prefix is in the default namespace.
bool ElementQNameIs(const Tarvel::Xml::ElementNode *element, std::string_view localName,
                    std::string_view namespaceUri) noexcept;

/// Whether `element` has an `xsi:type` whose value is `type`. A value without a prefix is in the default namespace.
/// @throws ParseException when the type's prefix is not bound.
bool ElementXsiTypeIs(const Tarvel::Xml::ElementNode &element, const QNameView &type);

/// Reads `text`, the value of an `xsi:type` of `element`, as a name. A name without a prefix is in the default namespace.
/// @return a view into `text` and into the tree.
/// @throws ParseException when the prefix is not bound.
QNameView ResolveXsiType(const Tarvel::Xml::ElementNode &element, std::string_view text);

} // namespace SsoClient
