// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenElement`, the assertion of a token that is added to a message.

#pragma once

#include <ssoclient/saml_token.h>
#include <tarvel/core/ref.h>
#include <tarvel/xml/node.h>

#include <functional>
#include <set>
#include <string>
#include <vector>

namespace SsoClient {

/// The assertion of a token, in a tree of its own.
class TokenElement {
public:
  /// Reads the text of `token`.
  /// @throws Tarvel::InvalidArgumentException when the token's signature depends on what is around the token: it uses inclusive
  ///         canonicalisation, or refers to its whole document. @throws what `ParseXML` throws.
  explicit TokenElement(const SamlToken &token);

  const Tarvel::Ref<Tarvel::Xml::ElementNode> &Get() const noexcept { return m_assertion; }

  /// The identifiers of the assertion and of the elements in it, and that of the token object.
  const std::set<std::string, std::less<>> &GetIdentifiers() const noexcept { return m_identifiers; }

  /// Prepares the assertion for becoming a child of `parent`: its names without a prefix stay in the namespace in which they
  /// are. `parent` does not change.
  /// @throws InvalidMessageException when the token's signature includes a prefix that is declared at `parent`.
  void PrepareFor(const Tarvel::Xml::ElementNode &parent) const;

private:
  void ReadOwnSignatures();
  void AddIncludedPrefixes(const Tarvel::Xml::ElementNode &apex, std::string_view prefixList);
  void AddIdentifiers();

  Tarvel::Ref<Tarvel::Xml::ElementNode> m_assertion;
  std::set<std::string, std::less<>> m_identifiers;
  std::vector<std::string> m_includedPrefixes; ///< the signature includes them, and the token does not declare them
};

} // namespace SsoClient
