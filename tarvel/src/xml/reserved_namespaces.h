// SPDX-License-Identifier: Apache-2.0
/// @file
/// The two namespaces that need no declaration (Namespaces in XML 1.0, section 3).

#pragma once

#include <string_view>

namespace Tarvel::Xml {

constexpr std::string_view XML_NAMESPACE = "http://www.w3.org/XML/1998/namespace"; ///< of the prefix "xml"
constexpr std::string_view XMLNS_NAMESPACE = "http://www.w3.org/2000/xmlns/";      ///< of the prefix "xmlns"

} // namespace Tarvel::Xml
