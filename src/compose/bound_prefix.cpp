// SPDX-License-Identifier: Apache-2.0

#include "compose/bound_prefix.h"

namespace SsoClient {

namespace {

using Tarvel::Xml::AsElement;
using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;

bool IsBoundTo(const ElementNode &element, std::string_view prefix, std::string_view namespaceUri) noexcept {
  std::string_view uri;
  return element.LookupNamespace(prefix, uri) && uri == namespaceUri;
}

} // namespace

std::string_view FindBoundPrefix(const ElementNode &element, std::string_view preferred,
                                 std::string_view namespaceUri) noexcept {
  if (IsBoundTo(element, preferred, namespaceUri)) {
    return preferred;
  }
  for (const ElementNode *owner = &element; owner; owner = AsElement(owner->GetParent())) {
    for (const Attribute *attribute = owner->GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
      if (attribute->IsNamespaceDeclaration() && !attribute->GetPrefix().empty() &&
          attribute->GetValue() == namespaceUri && IsBoundTo(element, attribute->GetLocalName(), namespaceUri)) {
        return attribute->GetLocalName();
      }
    }
  }
  return {};
}

std::string ChooseFreePrefix(const ElementNode &element, std::string_view preferred) {
  std::string prefix(preferred);
  std::string_view uri;
  for (unsigned number = 1; element.LookupNamespace(prefix, uri); ++number) {
    prefix = std::string(preferred) + std::to_string(number);
  }
  return prefix;
}

std::string BindPrefix(ElementNode &element, std::string_view preferred, std::string_view namespaceUri) {
  const std::string_view bound = FindBoundPrefix(element, preferred, namespaceUri);
  if (!bound.empty()) {
    return std::string(bound);
  }
  std::string prefix = ChooseFreePrefix(element, preferred);
  element.DefineAttribute("xmlns:" + prefix, namespaceUri);
  return prefix;
}

} // namespace SsoClient
