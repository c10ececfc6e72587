// SPDX-License-Identifier: Apache-2.0

#include "xml/security/reference_target.h"

#include <tarvel/core/string_util.h>

#include <string>

namespace Tarvel::Xml::Security {

namespace {

constexpr std::string_view WSU_NAMESPACE =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";

constexpr const char *WANTED_URI = "\"\", or \"#\" and an identifier";
constexpr const char *WANTED_TARGET = "one element with that identifier";

void Refuse(RefusalSink &sink, std::string_view uri, const char *why, const ElementNode *place, const char *wanted) {
  SignatureReport::Refusal &refusal =
      sink.Add(SignatureRule::REFERENCES,
               "The reference URI \"" + StringUtil::Shorten(uri) + "\" is not accepted: " + why, place);
  refusal.found = StringUtil::Shorten(uri);
  refusal.wanted = wanted;
}

/// Why a URI is not "#" and a bare name; null if it is.
const char *FaultOf(std::string_view uri) {
  if (uri.front() != '#') {
    return "it points outside the document";
  }
  if (uri.size() == 1) {
    return "it names nothing";
  }
  return uri.find('(') != std::string_view::npos ? "it is an XPointer" : nullptr;
}

bool IsIdentifier(const Attribute &attribute, const ElementNode &element) {
  const std::string_view name = attribute.GetName();
  if (name == "ID" || name == "Id" || name == "xml:id") {
    return true;
  }
  std::string_view uri;
  return attribute.GetLocalName() == "Id" && !attribute.IsNamespaceDeclaration() &&
         element.LookupNamespace(attribute.GetPrefix(), uri) && uri == WSU_NAMESPACE;
}

/// Whether the element is identified by `identifier`. The value is compared first, since it rarely matches.
bool HasIdentifier(const ElementNode &element, std::string_view identifier) {
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    if (attribute->GetValue() == identifier && IsIdentifier(*attribute, element)) {
      return true;
    }
  }
  return false;
}

/// The node after `node` in document order within the tree at `top`, or null.
const Node *NextInDocument(const Node *node, const Node *top) {
  if (node->GetFirstChild()) {
    return node->GetFirstChild();
  }
  while (node != top && !node->GetNextSibling()) {
    node = node->GetParent();
  }
  return node == top ? nullptr : node->GetNextSibling();
}

/// The index of the first reference whose URI equals the one at `index`.
std::size_t FirstEqual(const std::vector<ReferenceUri> &uris, std::size_t index) {
  std::size_t first = 0;
  while (uris[first].uri != uris[index].uri) {
    ++first;
  }
  return first;
}

void NoteMatches(const ElementNode &element, const std::vector<ReferenceUri> &uris,
                 std::vector<IdentifierSearch> &searches, RefusalSink &sink) {
  for (IdentifierSearch &search : searches) {
    if (search.isAmbiguous || !HasIdentifier(element, search.identifier)) {
      continue;
    }
    if (search.target) {
      search.isAmbiguous = true;
      Refuse(sink, uris[search.reference].uri, "several elements have that identifier", &element, WANTED_TARGET);
    }
    search.target = &element;
  }
}

} // namespace

std::vector<IdentifierSearch> PlanSearches(const std::vector<ReferenceUri> &uris, RefusalSink &sink) {
  std::vector<IdentifierSearch> searches;
  for (std::size_t index = 0; index < uris.size(); ++index) {
    const std::string_view uri = uris[index].uri;
    if (uri.empty() || FirstEqual(uris, index) != index) {
      continue;
    }
    if (const char *const fault = FaultOf(uri)) {
      Refuse(sink, uri, fault, uris[index].element, WANTED_URI);
      continue;
    }
    searches.push_back({uri.substr(1), index});
  }
  return searches;
}

std::vector<const Node *> ResolveReferences(const ElementNode &root, const std::vector<ReferenceUri> &uris,
                                            RefusalSink &sink) {
  const Node *top = root.GetRoot();
  std::vector<IdentifierSearch> searches = PlanSearches(uris, sink);
  if (!searches.empty()) {
    for (const Node *node = top; node; node = NextInDocument(node, top)) {
      if (const ElementNode *element = AsElement(node)) {
        NoteMatches(*element, uris, searches, sink);
      }
    }
  }
  std::vector<const Node *> targets(uris.size(), nullptr);
  for (const IdentifierSearch &search : searches) {
    if (!search.target) {
      const ReferenceUri &reference = uris[search.reference];
      Refuse(sink, reference.uri, "no element has that identifier", reference.element, WANTED_TARGET);
    }
    targets[search.reference] = search.isAmbiguous ? nullptr : search.target;
  }
  for (std::size_t index = 0; index < uris.size(); ++index) {
    targets[index] = uris[index].uri.empty() ? top : targets[FirstEqual(uris, index)];
  }
  return targets;
}

} // namespace Tarvel::Xml::Security
