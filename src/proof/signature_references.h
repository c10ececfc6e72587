// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the references of a signature refer to, and how its canonical forms depend on the elements around it.
///
/// These functions read signatures that others made and that are not verified here, in any form that XML Signature
/// allows.

#pragma once

#include <tarvel/xml/node.h>

#include <algorithm>
#include <cstddef>
#include <string_view>

namespace SsoClient {

/// Calls `function` with each prefix of a PrefixList, until it returns false.
template <typename Function>
void ForEachPrefix(std::string_view prefixList, const Function &function) {
  constexpr std::string_view WHITE_SPACE = " \t\r\n";
  for (std::size_t begin = prefixList.find_first_not_of(WHITE_SPACE); begin != std::string_view::npos;) {
    const std::size_t end = std::min(prefixList.find_first_of(WHITE_SPACE, begin), prefixList.size());
    if (!function(prefixList.substr(begin, end - begin))) {
      return;
    }
    begin = prefixList.find_first_not_of(WHITE_SPACE, end);
  }
}

/// A canonical form, and how it depends on declarations of the elements around its apex, which is its outermost
/// element.
struct ContextOfForm {
  bool isInclusive = false;    ///< it contains every declaration in scope
  std::string_view prefixList; ///< it contains the declarations of these prefixes, separated by white space

  /// Whether a new declaration of `prefix` around the apex changes it. "#default" is the default namespace.
  bool Includes(std::string_view prefix) const noexcept;
};

/// A `ds:Reference`.
struct SignatureReference {
  const Tarvel::Xml::ElementNode *element = nullptr;
  const Tarvel::Xml::Attribute *uri = nullptr; ///< null if it is not stated
  ContextOfForm context;                       ///< without a canonicalisation, XML Signature requires the inclusive one
  bool isTransformed = false; ///< has a transform that can select or make other content, such as XPath and XSLT

  /// The identifier in a reference "#x". Empty for every other reference.
  std::string_view GetIdentifier() const noexcept;
};

/// Reads a `ds:Reference`.
SignatureReference ReadSignatureReference(const Tarvel::Xml::ElementNode &reference) noexcept;

/// Reads a `ds:CanonicalizationMethod`. An unknown algorithm counts as inclusive.
ContextOfForm ReadCanonicalizationMethod(const Tarvel::Xml::ElementNode &method) noexcept;

} // namespace SsoClient
