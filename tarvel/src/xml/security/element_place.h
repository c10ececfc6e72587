// SPDX-License-Identifier: Apache-2.0
/// @file
/// The position of an element, as text for the end of a message.

#pragma once

#include <tarvel/xml/node.h>

#include <string>

namespace Tarvel::Xml::Security {

/// " at line L, column C", or nothing for an element that was not parsed.
inline std::string PlaceOf(const ElementNode &element) {
  if (element.GetLine() == 0) {
    return {};
  }
  return " at line " + std::to_string(element.GetLine()) + ", column " + std::to_string(element.GetColumn());
}

} // namespace Tarvel::Xml::Security
