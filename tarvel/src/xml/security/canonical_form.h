// SPDX-License-Identifier: Apache-2.0
/// @file
/// Canonical XML 1.0 and Exclusive XML Canonicalization 1.0 of a subtree.

#pragma once

#include <tarvel/io/writer.h>
#include <tarvel/xml/node.h>

#include <string>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// One of the four algorithms, with its parameter.
struct CanonicalizationMethod {
  bool isExclusive = false;
  bool withComments = false;
  std::vector<std::string> inclusivePrefixes; ///< exclusive only; sorted; the empty prefix is the default namespace
};

/// Sets `method` to the algorithm of that URI, without `inclusivePrefixes`. @return whether the URI is known.
bool FindCanonicalizationMethod(std::string_view algorithmUri, CanonicalizationMethod &method);

/// Sets the prefixes of an InclusiveNamespaces PrefixList, in which "#default" means the default namespace.
void SetInclusivePrefixes(CanonicalizationMethod &method, std::vector<std::string> prefixList);

/// Writes the canonical form of the subtree at `apex`, without the subtree at `omitted` (may be null). No recursion; the
/// cost is linear in the size of the subtree and of what is written.
/// @throws XmlSecurityException when the tree has no canonical form: an unbound prefix, a prefix bound to the empty
///         name, a relative namespace name, a forbidden binding of "xml" or "xmlns", an attribute that occurs twice; or
///         when the tree exceeds the limits in the source files.
void WriteCanonicalForm(const Node &apex, const CanonicalizationMethod &method, const Node *omitted, Writer &writer);

} // namespace Tarvel::Xml::Security
