// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares our parser of URI references with libxml2's.

#pragma once

#include <array>
#include <string>

namespace Tarvel {

/// Where the standard and libxml2 2.9.14 differ; we follow the standard.
enum UriDifference {
  EMPTY_PORT,          ///< "port = *DIGIT" may be empty; libxml2 wants one digit at least
  LARGE_PORT,          ///< ... and may have any number of digits; libxml2 wants an int
  ADDRESS,             ///< libxml2 takes anything in brackets for an address, even what would end the authority
  BRACKET_IN_FRAGMENT, ///< libxml2 accepts the brackets that an XPointer has; the standard wants them escaped
  URI_DIFFERENCES
};

struct UriComparison {
  bool isUriReference = false;                     ///< what we say
  std::string disagreement;                        ///< empty when both say the same, or differ only in the known ways
  std::array<bool, URI_DIFFERENCES> differences{}; ///< the known ways in which they differ
};

/// Compares verdict and parts. @param text without null characters, which end a text for libxml2.
UriComparison CompareWithLibxml2(const std::string &text);

} // namespace Tarvel
