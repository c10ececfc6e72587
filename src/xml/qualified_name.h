// SPDX-License-Identifier: Apache-2.0
/// @file
/// Qualified names: of elements, and written as text in attributes.

#pragma once

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

/// The name `name` in no namespace, as attributes without a prefix have it.
constexpr QNameView LocalName(std::string_view name) noexcept {
  return {std::string_view(), name};
}

/// Reads a name that is written with or without prefix, by the namespace declarations in scope at `element`; the first
/// colon ends the prefix. Without a colon the name is in `defaultNamespace`.
/// @return a view into `text`, into the tree and into `defaultNamespace`.
/// @throws ParseException when the prefix is not bound.
QNameView ResolveQName(const Tarvel::Xml::ElementNode &element, std::string_view text,
                       std::string_view defaultNamespace);

/// The same as a name that owns its texts.
/// @param name written on success only.
void ResolveQName(const Tarvel::Xml::ElementNode &element, std::string_view text, std::string_view defaultNamespace,
                  Tarvel::Xml::QName &name);

/// Whether `element` is there, has that local name, and its prefix is bound to that namespace.
bool ElementQNameIs(const Tarvel::Xml::ElementNode *element, std::string_view localName,
                    std::string_view namespaceUri) noexcept;

/// Whether `element` has an `xsi:type` that names `type`; without a prefix it names a type of the default namespace.
/// @throws ParseException when the type's prefix is not bound.
bool ElementXsiTypeIs(const Tarvel::Xml::ElementNode &element, const QNameView &type);

/// Reads `text`, the value of an `xsi:type` of `element`, as a name; without a prefix it is of the default namespace.
/// @return a view into `text` and into the tree.
/// @throws ParseException when the prefix is not bound.
QNameView ResolveXsiType(const Tarvel::Xml::ElementNode &element, std::string_view text);

} // namespace SsoClient
