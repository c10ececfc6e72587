// SPDX-License-Identifier: Apache-2.0
/// @file
/// Qualified names: of elements, and written as text in attributes.

#pragma once

#include <tarvel/xml/node.h>
#include <tarvel/xml/qname.h>

#include <string_view>

namespace SsoClient {

/// The name `name` in no namespace, as attributes without a prefix have it.
Tarvel::Xml::QName LocalName(std::string_view name);

/// Reads a name that is written with or without prefix, by the namespace declarations in scope at `element`; the first
/// colon ends the prefix. Without a colon the name is in `defaultNamespace`.
/// @param name written on success only.
/// @throws ParseException when the prefix is not bound.
void ResolveQName(const Tarvel::Xml::ElementNode &element, std::string_view text, std::string_view defaultNamespace,
                  Tarvel::Xml::QName &name);

/// Whether `element` is there, has that local name, and its prefix is bound to that namespace.
bool ElementQNameIs(const Tarvel::Xml::ElementNode *element, std::string_view localName,
                    std::string_view namespaceUri) noexcept;

/// Whether `element` has an `xsi:type` that names `type`; without a prefix it names a type of the default namespace.
/// @throws ParseException when the type's prefix is not bound.
bool ElementXsiTypeIs(const Tarvel::Xml::ElementNode &element, const Tarvel::Xml::QName &type);

/// Reads `text`, the value of an `xsi:type` of `element`, as a name; without a prefix it is of the default namespace.
/// @throws ParseException when the prefix is not bound.
Tarvel::Xml::QName ResolveXsiType(const Tarvel::Xml::ElementNode &element, std::string_view text);

} // namespace SsoClient
