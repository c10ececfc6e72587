// SPDX-License-Identifier: Apache-2.0
/// @file
/// Documents generated from a seed, with many of the constructs for which canonicalisation has rules.

#pragma once

#include "random_source.h"

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace Testing {

/// A well-formed document without a document type declaration: namespaces declared, declared again and undeclared,
/// default namespaces, xml: attributes, CDATA sections, comments, processing instructions, references, carriage
/// returns, characters of all lengths; some have texts of more than 4096 octets, and some have more than 16 prefixes
/// in scope. Each element has an attribute ID: "e0" for the document element, then "e1" and so on in document order.
struct GeneratedDocument {
  std::string text;
  std::size_t elements = 0;
  std::size_t endOfRoot = 0; ///< where the end tag of the document element begins
};

enum class NamespaceNames {
  PLAIN, ///< URIs without a character that is escaped in an attribute value
  ANY    ///< other names as well
};

GeneratedDocument GenerateDocument(RandomSource &random, NamespaceNames names = NamespaceNames::PLAIN);

/// Prefixes for InclusiveNamespaces: some that the documents declare, some that they never declare, and "#default".
std::vector<std::string> GeneratePrefixList(RandomSource &random);

} // namespace Testing
