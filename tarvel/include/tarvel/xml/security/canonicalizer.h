// SPDX-License-Identifier: Apache-2.0
/// @file
/// Canonical XML.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/node.h>

#include <string>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// Algorithm URIs of canonicalisation.
namespace CanonicalizationUri {
constexpr std::string_view INCLUSIVE = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315";
constexpr std::string_view INCLUSIVE_WITH_COMMENTS = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#WithComments";
constexpr std::string_view EXCLUSIVE = "http://www.w3.org/2001/10/xml-exc-c14n#";
constexpr std::string_view EXCLUSIVE_WITH_COMMENTS = "http://www.w3.org/2001/10/xml-exc-c14n#WithComments";
} // namespace CanonicalizationUri

/// Writes nodes in the canonical form of one algorithm. Immutable; safe on any thread.
class TARVEL_API Canonicalizer : public Object {
public:
  /// Writes the canonical form of the subtree at `node`, in the context of its document; for a document node, of the whole
  /// document. `writer` receives it in pieces.
  /// @throws XmlSecurityException when the tree has no canonical form: an unbound prefix, a prefix bound to the empty name, a
  ///         relative namespace name, a forbidden binding of "xml" or "xmlns", or an attribute that occurs twice; and when the
  ///         tree exceeds the platform's limits. Discard what was written before.
  virtual void Canonicalize(const Node &node, Writer &writer) const = 0;

protected:
  ~Canonicalizer() override;
};

/// The canonicalizer for an algorithm URI: one of `CanonicalizationUri`, or the inclusive URI with only "#" appended,
/// which means the same algorithm.
/// @param inclusivePrefixes for the exclusive algorithms, the InclusiveNamespaces PrefixList ("#default" is the default
///        namespace); must be empty for the inclusive ones.
/// @throws XmlSecurityException for any other algorithm; the message contains the URI.
TARVEL_API Ref<Canonicalizer> CreateCanonicalizer(std::string_view algorithmUri,
                                                  const std::vector<std::string> &inclusivePrefixes = {});

} // namespace Tarvel::Xml::Security
