// SPDX-License-Identifier: Apache-2.0

#include "xml/security/reference_target.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/exceptions.h>

#include <algorithm>
#include <string>

namespace Tarvel::Xml::Security {

namespace {

constexpr std::string_view WSU_NAMESPACE =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";

[[noreturn]] void Refuse(std::string_view uri, const char *why) {
  throw XmlSecurityException("The reference URI \"" + StringUtil::Shorten(uri) + "\" is not accepted: " + why);
}

/// The identifier after the "#", which must be a bare name.
std::string_view RequireIdentifier(std::string_view uri) {
  if (uri.front() != '#') {
    Refuse(uri, "it points outside the document");
  }
  if (uri.size() == 1) {
    Refuse(uri, "it names nothing");
  }
  if (uri.find('(') != std::string_view::npos) {
    Refuse(uri, "it is an XPointer");
  }
  return uri.substr(1);
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

/// The index of the first URI that equals the one at `index`.
std::size_t FirstEqual(const std::vector<std::string_view> &uris, std::size_t index) {
  return static_cast<std::size_t>(std::find(uris.begin(), uris.end(), uris[index]) - uris.begin());
}

void NoteMatches(const ElementNode &element, const std::vector<std::string_view> &uris,
                 std::vector<IdentifierSearch> &searches) {
  for (IdentifierSearch &search : searches) {
    if (!HasIdentifier(element, search.identifier)) {
      continue;
    }
    if (search.target) {
      Refuse(uris[search.reference], "several elements have that identifier");
    }
    search.target = &element;
  }
}

} // namespace

std::vector<IdentifierSearch> PlanSearches(const std::vector<std::string_view> &uris) {
  std::vector<IdentifierSearch> searches;
  for (std::size_t index = 0; index < uris.size(); ++index) {
    if (!uris[index].empty() && FirstEqual(uris, index) == index) {
      searches.push_back({RequireIdentifier(uris[index]), index});
    }
  }
  return searches;
}

std::vector<const Node *> ResolveReferences(const ElementNode &root, const std::vector<std::string_view> &uris) {
  const Node *top = root.GetRoot();
  std::vector<IdentifierSearch> searches = PlanSearches(uris);
  if (!searches.empty()) {
    for (const Node *node = top; node; node = NextInDocument(node, top)) {
      if (const ElementNode *element = AsElement(node)) {
        NoteMatches(*element, uris, searches);
      }
    }
  }
  std::vector<const Node *> targets(uris.size(), top);
  for (const IdentifierSearch &search : searches) {
    if (!search.target) {
      Refuse(uris[search.reference], "no element has that identifier");
    }
    targets[search.reference] = search.target;
  }
  for (std::size_t index = 0; index < uris.size(); ++index) {
    targets[index] = targets[FirstEqual(uris, index)];
  }
  return targets;
}

} // namespace Tarvel::Xml::Security
