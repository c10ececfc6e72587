// SPDX-License-Identifier: Apache-2.0
/// @file
/// Qualified names: the names of elements, and names in the text of attributes.

#pragma once

#include "model/namespaces.h"
#include "xml/deviation_sink.h"

#include <tarvel/xml/node.h>
#include <tarvel/xml/qname.h>

#include <optional>
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

/// The text of `name` for `Tarvel::MessageFormatter`.
std::string FormatMessageArgument(const QNameView &name);

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

/// The same for the name or the value of an attribute of `element`. A prefix that is not bound is reported to `sink`.
/// @param attributeName the place that is reported.
/// @return nullopt if the prefix is not bound.
std::optional<QNameView> ResolveQName(const Tarvel::Xml::ElementNode &element, std::string_view attributeName,
                                      std::string_view text, std::string_view defaultNamespace, DeviationSink &sink);

/// The same, but the result owns its texts.
/// @param name set on success only.
void ResolveQName(const Tarvel::Xml::ElementNode &element, std::string_view text, std::string_view defaultNamespace,
                  Tarvel::Xml::QName &name);

/// Whether `element` is not null, has that local name, and is in that namespace. An element without a
/// prefix is in the default namespace.
bool ElementQNameIs(const Tarvel::Xml::ElementNode *element, std::string_view localName,
                    std::string_view namespaceUri) noexcept;

/// Whether `element` has an `xsi:type` whose value is `type`. A value without a prefix is in the default namespace. If the
/// type's prefix is not bound, that is reported, and the result is false.
bool ElementXsiTypeIs(const Tarvel::Xml::ElementNode &element, const QNameView &type,
                      DeviationSink &sink = ThrowingSink());

/// Reads the value of `attribute`, an `xsi:type` of `element`, as a name. A name without a prefix is in the default
/// namespace. A prefix that is not bound is reported.
/// @return a view into the tree, or nullopt if the prefix is not bound.
std::optional<QNameView> ResolveXsiType(const Tarvel::Xml::ElementNode &element,
                                        const Tarvel::Xml::Attribute &attribute, DeviationSink &sink);

} // namespace SsoClient
