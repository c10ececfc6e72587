// SPDX-License-Identifier: Apache-2.0
/// @file
/// The syntax of a `ds:Signature`, read without checking its algorithms.

#pragma once

#include <tarvel/xml/node.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// An element that specifies an algorithm: CanonicalizationMethod, SignatureMethod, DigestMethod or Transform. Views belong to
/// the tree.
struct AlgorithmSyntax {
  const ElementNode *element = nullptr;
  std::string_view uri;
  std::optional<std::string_view> prefixList; ///< of an ec:InclusiveNamespaces, as written
  std::string_view otherParameter;            ///< name of the first other child element; empty if there is none
};

struct ReferenceSyntax {
  const ElementNode *element = nullptr;
  std::string_view uri;
  std::optional<std::string_view> type;
  std::vector<AlgorithmSyntax> transforms;
  AlgorithmSyntax digestMethod;
  const ElementNode *digestValueElement = nullptr;
  std::vector<std::uint8_t> digestValue;
};

struct SignatureSyntax {
  const ElementNode *signedInfo = nullptr;
  AlgorithmSyntax canonicalizationMethod;
  AlgorithmSyntax signatureMethod;
  std::vector<ReferenceSyntax> references; ///< may be empty; then nothing is signed
  const ElementNode *signatureValueElement = nullptr;
  std::vector<std::uint8_t> signatureValue;
  const ElementNode *keyInfo = nullptr; ///< may be null; its content is not checked
  const ElementNode *object = nullptr;  ///< the first ds:Object, or null
};

/// Reads the syntax (XML Signature, section 4): elements of the ds namespace in their order, the attributes that they may
/// have and those that they must have, Base64 text where it belongs, nothing but white space and comments between elements.
/// @throws SignatureSyntaxException naming what is wrong and where.
SignatureSyntax ReadSignatureSyntax(const ElementNode &signature);

} // namespace Tarvel::Xml::Security
