// SPDX-License-Identifier: Apache-2.0
/// @file
/// The form of a `ds:Signature`, read without judging its algorithms.

#pragma once

#include <tarvel/xml/node.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// An element that names an algorithm: CanonicalizationMethod, SignatureMethod, DigestMethod or Transform. Views belong to
/// the tree.
struct AlgorithmSyntax {
  std::string_view uri;
  std::optional<std::string_view> prefixList; ///< of an ec:InclusiveNamespaces, as written
  std::string_view otherParameter; ///< name of the first child element that is none; empty when there is none such
};

struct ReferenceSyntax {
  std::string_view uri;
  std::optional<std::string_view> type;
  std::vector<AlgorithmSyntax> transforms;
  AlgorithmSyntax digestMethod;
  std::vector<std::uint8_t> digestValue;
};

struct SignatureSyntax {
  const ElementNode *signedInfo = nullptr;
  AlgorithmSyntax canonicalizationMethod;
  AlgorithmSyntax signatureMethod;
  std::vector<ReferenceSyntax> references; ///< may be empty: whoever asks what is signed then learns that nothing is
  std::vector<std::uint8_t> signatureValue;
  const ElementNode *keyInfo = nullptr; ///< may be null; what it holds is not looked at
  bool hasObject = false;
};

/// Reads the form (XML Signature, section 4): elements of the ds namespace in their order, the attributes that they may
/// have and those that they must have, Base64 text where it belongs, nothing but white space and comments between elements.
/// @throws SignatureSyntaxException naming what is wrong and where.
SignatureSyntax ReadSignatureSyntax(const ElementNode &signature);

} // namespace Tarvel::Xml::Security
