// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares our parser of URI references with libxml2's.

#pragma once

#include <array>
#include <string>

namespace Tarvel {

/// Where the standard and libxml2 2.9.14 differ; we follow the standard.
enum UriDifference {
  EMPTY_PORT,          ///< "port = *DIGIT" may be empty; libxml2 requires at least one digit
  LARGE_PORT,          ///< ... and may have any number of digits; libxml2 requires that it fits an int
  ADDRESS,             ///< libxml2 accepts anything in brackets as an address, even what would end the authority
  BRACKET_IN_FRAGMENT, ///< libxml2 accepts the brackets of an XPointer; the standard requires that they are escaped
  URI_DIFFERENCES
};

struct UriComparison {
  bool isUriReference = false;                     ///< the result of our parser
  std::string disagreement;                        ///< empty when both agree, or differ only in the known ways
  std::array<bool, URI_DIFFERENCES> differences{}; ///< the known ways in which they differ
};

/// Compares whether both accept `text`, and the parts that they find.
/// @param text without null characters, which end a text for libxml2.
UriComparison CompareWithLibxml2(const std::string &text);

} // namespace Tarvel
