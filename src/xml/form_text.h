// SPDX-License-Identifier: Apache-2.0
/// @file
/// Arguments of `Refuse` for what the accepted form allows at a place, and for what is there. They become texts only if
/// the texts are needed.
///
/// Names in namespaces that the form uses are written with the usual prefix, such as "saml:Conditions", even if the
/// document has another prefix. `WhatIsAt` writes names as they are in the document.

#pragma once

#include "xml/qualified_name.h"

#include <tarvel/xml/node.h>

#include <initializer_list>
#include <string>
#include <string_view>

namespace SsoClient {

/// The element of a name: "element saml:Conditions".
struct ElementOfName {
  QNameView name;
};

/// A set of attributes: "Name, NameFormat (optional)", or "no attributes".
template <typename Name>
struct AttributesOfNames {
  std::initializer_list<Name> required;
  std::initializer_list<Name> optional;
};

/// What is at a node: "element saml2:Advice", "text", "processing instruction"; empty for null.
struct WhatIsAt {
  const Tarvel::Xml::Node *node;
};

std::string FormatMessageArgument(const ElementOfName &element);
std::string FormatMessageArgument(const AttributesOfNames<std::string_view> &attributes);
std::string FormatMessageArgument(const AttributesOfNames<QNameView> &attributes);
std::string FormatMessageArgument(const WhatIsAt &found);

} // namespace SsoClient
