// SPDX-License-Identifier: Apache-2.0
/// @file
/// The deviations that the parser of the profile SAML2 reports, and the messages that several of them share.

#pragma once

#include "unit/token/assertion_refusals.h"
#include "unit/token/saml2_assertion.h"

#include <string>
#include <vector>

namespace Testing {

using Deviations = std::vector<ExpectedDeviation>;

/// All deviations that a parse of `text` reports if it continues.
inline Deviations In(const std::string &text) {
  return ParsedSaml2(text).deviations;
}

inline std::string Unexpected(const std::string &attribute, const std::string &element) {
  return "Unexpected attribute '" + attribute + "' on element '" + element + "'";
}

inline std::string Missing(const std::string &attribute, const std::string &element) {
  return "Node '" + element + " is missing required attribute '" + attribute + "'";
}

inline std::string Content(const std::string &element, const std::string &found) {
  return "Unexpected content of element '" + element + "': " + found;
}

} // namespace Testing
