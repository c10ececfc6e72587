// SPDX-License-Identifier: Apache-2.0

#include "proof/covered_elements.h"

#include "token/element_paths.h"
#include "xml/tree_walk.h"

#include <algorithm>
#include <utility>

namespace SsoClient {

namespace {

using CoveredElement = VerifiedMessage::CoveredElement;
using Target = Tarvel::Xml::Security::Signature::Coverage::Target;
using Tarvel::Xml::AsElement;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

/// Adds the element, unless it is there. All references to an element that contains the signature omit it: no signature
/// contains the digest of itself.
void Add(std::vector<CoveredElement> &covered, const ElementNode *element, const ElementNode *omitted) {
  const bool isThere = std::any_of(covered.begin(), covered.end(),
                                   [element](const CoveredElement &one) { return one.element == element; });
  if (!isThere) {
    CoveredElement added;
    added.element = element;
    added.omitted = omitted;
    covered.push_back(std::move(added));
  }
}

bool IsInside(const Node *node, const Node *element) noexcept {
  while (node && node != element) {
    node = node->GetParent();
  }
  return node != nullptr;
}

/// Sorts the elements by their places in the document. The walk ends at the last of them, and does not enter an element
/// of the list that contains no other one.
std::vector<CoveredElement> InDocumentOrder(std::vector<CoveredElement> &&unordered, const ElementNode *top) {
  std::vector<CoveredElement> ordered;
  ordered.reserve(unordered.size());
  bool enters = true;
  for (const Node *node = top; node && ordered.size() < unordered.size(); node = NextInTree(node, top, enters)) {
    const auto found = std::find_if(unordered.begin(), unordered.end(),
                                    [node](const CoveredElement &one) { return one.element == node; });
    enters = true;
    if (found != unordered.end()) {
      ordered.push_back(std::move(*found));
      found->element = nullptr;
      enters = std::any_of(unordered.begin(), unordered.end(),
                           [node](const CoveredElement &one) { return IsInside(one.element, node); });
    }
  }
  return ordered;
}

bool IsCoveredBy(const CoveredElement &covered, const ElementNode &element) noexcept {
  for (const Node *node = &element; node; node = node->GetParent()) {
    if (node == covered.omitted) {
      return false;
    }
    if (node == covered.element) {
      return true;
    }
  }
  return false;
}

} // namespace

std::vector<CoveredElement> ListCoveredElements(const std::vector<Target> &targets, const ElementNode &signature,
                                                const Tarvel::Xml::Document &document) {
  std::vector<CoveredElement> covered;
  for (const Target &target : targets) {
    const ElementNode *const element = AsElement(target.node);
    Add(covered, element ? element : document.GetDocumentElement(), target.omitsSignature ? &signature : nullptr);
  }
  covered = InDocumentOrder(std::move(covered), document.GetDocumentElement());
  ElementPaths paths;
  for (CoveredElement &one : covered) {
    one.path = paths.Of(*one.element);
  }
  return covered;
}

bool IsCoveredBy(const std::vector<CoveredElement> &covered, const ElementNode &element) noexcept {
  return std::any_of(covered.begin(), covered.end(),
                     [&element](const CoveredElement &one) { return IsCoveredBy(one, element); });
}

} // namespace SsoClient
