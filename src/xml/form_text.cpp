// SPDX-License-Identifier: Apache-2.0

#include "xml/form_text.h"

#include <tarvel/core/string_util.h>

#include <array>
#include <utility>

namespace SsoClient {

namespace {

constexpr std::array<std::pair<std::string_view, std::string_view>, 5> USUAL_PREFIXES{{
    {Namespaces::SAML, "saml:"},
    {Namespaces::DS, "ds:"},
    {Namespaces::XSI, "xsi:"},
    {Namespaces::DELEGATION, "del:"},
    {Namespaces::RSA_SAML2, "rsa:"},
}};

std::string ShortName(const QNameView &name) {
  for (const auto &[uri, prefix] : USUAL_PREFIXES) {
    if (name.namespaceUri == uri) {
      return std::string(prefix).append(name.localName);
    }
  }
  // Many elements can be in one namespace, whose URI may be as long as the document.
  return QNameView(Tarvel::StringUtil::Shorten(name.namespaceUri), name.localName).ToString();
}

std::string ShortName(std::string_view name) {
  return std::string(name);
}

template <typename Name>
std::string TextOf(const AttributesOfNames<Name> &attributes) {
  std::string text;
  const auto add = [&](const Name &name, std::string_view remark) {
    text.append(text.empty() ? "" : ", ").append(ShortName(name)).append(remark);
  };
  for (const Name &name : attributes.required) {
    add(name, "");
  }
  for (const Name &name : attributes.optional) {
    add(name, " (optional)");
  }
  return text.empty() ? "no attributes" : text;
}

} // namespace

std::string FormatMessageArgument(const ElementOfName &element) {
  return "element " + ShortName(element.name);
}

std::string FormatMessageArgument(const AttributesOfNames<std::string_view> &attributes) {
  return TextOf(attributes);
}

std::string FormatMessageArgument(const AttributesOfNames<QNameView> &attributes) {
  return TextOf(attributes);
}

std::string FormatMessageArgument(const WhatIsAt &found) {
  if (!found.node) {
    return {};
  }
  switch (found.node->GetKind()) {
  case Tarvel::Xml::NodeKind::ELEMENT:
    return std::string("element ").append(Tarvel::Xml::AsElement(found.node)->GetName());
  case Tarvel::Xml::NodeKind::TEXT:
    return "text";
  default:
    return "processing instruction";
  }
}

} // namespace SsoClient
