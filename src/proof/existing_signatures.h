// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ExistingSignatures`, which checks that a change of a message leaves the signatures in it valid.

#pragma once

#include "proof/signature_references.h"

#include <tarvel/xml/node.h>

#include <functional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {

/// The signatures anywhere in a message. It refers to elements and attributes of the tree, which must stay until the
/// last call; others may be added.
class ExistingSignatures {
public:
  /// Reads the tree at `envelope`.
  /// @param newIdentifiers those of elements that will be added to the tree
  /// @throws InvalidMessageException when an element of the tree has one of `newIdentifiers`.
  ExistingSignatures(const Tarvel::Xml::ElementNode &envelope,
                     const std::set<std::string, std::less<>> &newIdentifiers);

  /// @throws InvalidMessageException when a signature covers one of `elements`, or the whole document, or what it
  ///         covers cannot be determined.
  void RequireUncovered(const std::vector<const Tarvel::Xml::ElementNode *> &elements) const;

  /// @throws InvalidMessageException when a new declaration of `prefix` at `element` would change what a signature
  ///         inside of it signs.
  void RequireIndependence(const Tarvel::Xml::ElementNode &element, std::string_view prefix) const;

private:
  struct CoveredElement {
    SignatureReference reference;
    const Tarvel::Xml::ElementNode *target = nullptr; ///< null if no element, or more than one, has the identifier
  };
  struct SignedForm {
    const Tarvel::Xml::ElementNode *apex;
    ContextOfForm context;
  };

  void FindReferences(const Tarvel::Xml::ElementNode &envelope);
  void ResolveReferences(const Tarvel::Xml::ElementNode &envelope,
                         const std::set<std::string, std::less<>> &newIdentifiers);

  std::vector<CoveredElement> m_covered;
  std::vector<SignedForm> m_signedInfos;
};

} // namespace SsoClient
