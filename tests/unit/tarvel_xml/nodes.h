// SPDX-License-Identifier: Apache-2.0
/// @file
/// Making nodes and looking up prefixes in tests.

#pragma once

#include <tarvel/xml/node.h>

#include <string>
#include <string_view>

namespace Testing {

inline Tarvel::Ref<Tarvel::Xml::ElementNode> MakeElement(std::string_view localName, std::string_view prefix = "") {
  Tarvel::Ref<Tarvel::Xml::ElementNode> element;
  Tarvel::Xml::CreateElementNode(prefix, localName, element);
  return element;
}

inline Tarvel::Ref<Tarvel::Xml::TextNode> MakeText(std::string_view value) {
  Tarvel::Ref<Tarvel::Xml::TextNode> text;
  Tarvel::Xml::CreateTextNode(text);
  text->SetValue(value);
  return text;
}

/// "bound to 'NAMESPACE'" or "unbound".
inline std::string Lookup(const Tarvel::Xml::ElementNode &element, std::string_view prefix) {
  std::string_view uri;
  return element.LookupNamespace(prefix, uri) ? "bound to '" + std::string(uri) + "'" : "unbound";
}

} // namespace Testing
