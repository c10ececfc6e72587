// SPDX-License-Identifier: Apache-2.0

#include "xml/qualified_name.h"

#include "xml/refuse.h"

#include <string>

namespace SsoClient {

using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::QName;

namespace {

QName ToQName(const QNameView &name) {
  return QName(std::string(name.namespaceUri), std::string(name.localName));
}

} // namespace

std::string QNameView::ToString() const {
  return ToQName(*this).ToString();
}

std::string FormatMessageArgument(const QNameView &name) {
  return name.ToString();
}

QNameView ResolveQName(const ElementNode &element, std::string_view text, std::string_view defaultNamespace) {
  return ResolveQName(element, std::string_view(), text, defaultNamespace, ThrowingSink()).value();
}

std::optional<QNameView> ResolveQName(const ElementNode &element, std::string_view attributeName, std::string_view text,
                                      std::string_view defaultNamespace, DeviationSink &sink) {
  const std::size_t colon = text.find(':');
  if (colon == std::string_view::npos) {
    return QNameView(defaultNamespace, text);
  }
  const std::string_view prefix = text.substr(0, colon);
  std::string_view namespaceUri;
  if (!element.LookupNamespace(prefix, namespaceUri)) {
    // The missing blank and the two different quotes are part of the established form of the message.
    Refuse(sink, {element, attributeName}, "a declared prefix", text, "Element %1at %2,%3 uses undefined prefix: `%4'",
           element.GetName(), element.GetLine(), element.GetColumn(), prefix);
    return std::nullopt;
  }
  return QNameView(namespaceUri, text.substr(colon + 1));
}

void ResolveQName(const ElementNode &element, std::string_view text, std::string_view defaultNamespace, QName &name) {
  name = ToQName(ResolveQName(element, text, defaultNamespace));
}

bool ElementQNameIs(const ElementNode *element, std::string_view localName, std::string_view namespaceUri) noexcept {
  return element && element->HasQName(namespaceUri, localName);
}

bool ElementXsiTypeIs(const ElementNode &element, const QNameView &type, DeviationSink &sink) {
  const Attribute *const attribute = element.FindAttribute(XSI_TYPE.namespaceUri, XSI_TYPE.localName);
  return attribute && ResolveXsiType(element, *attribute, sink) == type;
}

std::optional<QNameView> ResolveXsiType(const ElementNode &element, const Attribute &attribute, DeviationSink &sink) {
  std::string_view defaultNamespace;
  element.LookupNamespace(std::string_view(), defaultNamespace);
  return ResolveQName(element, attribute.GetName(), attribute.GetValue(), defaultNamespace, sink);
}

} // namespace SsoClient
