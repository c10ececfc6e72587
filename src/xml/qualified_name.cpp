// SPDX-License-Identifier: Apache-2.0
#include "xml/qualified_name.h"

#include "model/namespaces.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/message_formatter.h>

#include <string>

namespace SsoClient {

using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::QName;

QName LocalName(std::string_view name) {
  return QName(std::string(), std::string(name));
}

void ResolveQName(const ElementNode &element, std::string_view text, std::string_view defaultNamespace, QName &name) {
  const std::size_t colon = text.find(':');
  if (colon == std::string_view::npos) {
    name = QName(std::string(defaultNamespace), std::string(text));
    return;
  }
  const std::string_view prefix = text.substr(0, colon);
  std::string_view namespaceUri;
  if (!element.LookupNamespace(prefix, namespaceUri)) {
    // The missing blank and the unlike quotes belong to the message's established form.
    throw ParseException(Tarvel::MessageFormatter::ASPrint("Element %1at %2,%3 uses undefined prefix: `%4'",
                                                           element.GetName(), element.GetLine(), element.GetColumn(),
                                                           prefix));
  }
  name = QName(std::string(namespaceUri), std::string(text.substr(colon + 1)));
}

bool ElementQNameIs(const ElementNode *element, std::string_view localName, std::string_view namespaceUri) noexcept {
  return element && element->HasQName(namespaceUri, localName);
}

bool ElementXsiTypeIs(const ElementNode &element, const QName &type) {
  const Attribute *const attribute = element.FindAttribute(Namespaces::XSI, "type");
  return attribute && ResolveXsiType(element, attribute->GetValue()) == type;
}

QName ResolveXsiType(const ElementNode &element, std::string_view text) {
  std::string_view defaultNamespace;
  element.LookupNamespace(std::string_view(), defaultNamespace);
  QName type;
  ResolveQName(element, text, defaultNamespace, type);
  return type;
}

} // namespace SsoClient
