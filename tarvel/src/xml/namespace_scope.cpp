// SPDX-License-Identifier: Apache-2.0

#include "xml/namespace_scope.h"

#include "core/uri_reference.h"
#include "xml/reserved_namespaces.h"

#include <algorithm>
#include <array>
#include <numeric>
#include <tuple>
#include <utility>

namespace Tarvel::Xml {

namespace {

// Up to this number, every two attributes are compared; more are sorted first.
constexpr std::size_t FEW_ATTRIBUTES = 8;

} // namespace

std::size_t NamespaceScope::Enter(const char *tag, const WrittenName &name,
                                  const std::vector<AttributeEvent> &attributes) {
  if (name.GetPrefix() == "xmlns") {
    m_cursor.Refuse(Refusal::XMLNS_ELEMENT, name.text.data());
  }
  const std::size_t before = m_declarations.size();
  for (const AttributeEvent &attribute : attributes) {
    if (attribute.IsNamespaceDeclaration()) {
      Declare(attribute);
    }
  }
  if (m_declarations.size() > MAX_NAMESPACES_IN_SCOPE) {
    m_cursor.Refuse(Refusal::TOO_MANY_DECLARATIONS, tag);
  }
  CheckNames(attributes);
  return m_declarations.size() - before;
}

void NamespaceScope::Declare(const AttributeEvent &declaration) {
  const std::string_view prefix = declaration.prefixLength ? declaration.GetLocalName() : std::string_view();
  CheckDeclaration(declaration, prefix);
  Declaration declared;
  declared.prefix = prefix;
  if (m_cursor.IsInSource(declaration.value)) {
    declared.written = declaration.value;
  } else {
    declared.replaced = std::string(declaration.value);
  }
  m_declarations.push_back(std::move(declared));
}

void NamespaceScope::CheckDeclaration(const AttributeEvent &declaration, std::string_view prefix) {
  const std::string_view name = declaration.value;
  const auto refuse = [&](Refusal refusal, std::string_view found = {}) {
    m_cursor.Refuse(refusal, declaration.name.data(), found);
  };
  if (prefix == "xmlns") {
    refuse(Refusal::XMLNS_DECLARED);
  }
  if (name == XMLNS_NAMESPACE) {
    refuse(Refusal::XMLNS_NAMESPACE_BOUND);
  }
  if ((prefix == "xml") != (name == XML_NAMESPACE)) {
    refuse(prefix == "xml" ? Refusal::XML_BOUND_TO_OTHER : Refusal::XML_NAMESPACE_BOUND);
  }
  if (name.empty() && !prefix.empty()) {
    refuse(Refusal::PREFIX_UNDECLARED, prefix);
  }
  if (std::find(m_knownNames.begin(), m_knownNames.end(), name) != m_knownNames.end()) {
    return;
  }
  if (!IsUriReference(name)) {
    refuse(Refusal::NOT_A_URI_REFERENCE, name);
  }
  if (m_cursor.IsInSource(name)) {
    m_knownNames[m_nextKnownName] = name;
    m_nextKnownName = (m_nextKnownName + 1) % m_knownNames.size();
  }
}

void NamespaceScope::CheckNames(const std::vector<AttributeEvent> &attributes) {
  if (attributes.size() > FEW_ATTRIBUTES) {
    CheckManyNames(attributes);
  } else if (attributes.size() > 1) {
    CheckFewNames(attributes);
  }
}

// If several pairs are forbidden, the pair whose second attribute comes first is reported.
void NamespaceScope::CheckFewNames(const std::vector<AttributeEvent> &attributes) {
  constexpr std::size_t NOT_LOOKED_UP = UNKNOWN - 1;
  std::array<std::size_t, FEW_ATTRIBUTES> namespaces; // each is looked up at most once: there may be many declarations
  namespaces.fill(NOT_LOOKED_UP);
  const auto getNamespace = [&](std::size_t index) {
    if (namespaces[index] == NOT_LOOKED_UP) {
      namespaces[index] = FindNamespace(attributes[index].GetPrefix());
    }
    return namespaces[index];
  };
  for (std::size_t second = 1; second < attributes.size(); ++second) {
    for (std::size_t first = 0; first < second; ++first) {
      if (attributes[first].GetLocalName() != attributes[second].GetLocalName()) {
        continue;
      }
      const bool isOneName = attributes[first].name == attributes[second].name;
      if (isOneName || (getNamespace(first) != UNKNOWN && getNamespace(first) == getNamespace(second))) {
        RefusePair(attributes[first], attributes[second]);
      }
    }
  }
}

/// Refuses two attributes that have the same name.
void NamespaceScope::RefusePair(const AttributeEvent &first, const AttributeEvent &second) const {
  if (first.name == second.name) {
    m_cursor.Refuse(Refusal::ATTRIBUTE_TWICE, second.name.data(), second.name);
  }
  m_cursor.Refuse(Refusal::SAME_NAMESPACE_AND_NAME, second.name.data(), first.name, second.name);
}

// Sorting makes attributes with the same local name adjacent. Among these, a second sorting makes those of one
// namespace adjacent. If several pairs are forbidden, the pair whose second attribute comes first is reported.
void NamespaceScope::CheckManyNames(const std::vector<AttributeEvent> &attributes) {
  SortByName(attributes);
  AttributePair firstPair{UNKNOWN, UNKNOWN};
  for (auto begin = m_order.begin(); begin != m_order.end();) {
    const std::string_view localName = attributes[*begin].GetLocalName();
    const auto end = std::find_if(begin, m_order.end(), [&attributes, localName](std::size_t index) {
      return attributes[index].GetLocalName() != localName;
    });
    if (end - begin > 1) {
      firstPair = std::min(firstPair, FindPair(attributes, begin, end));
    }
    begin = end;
  }
  if (firstPair.second != UNKNOWN) {
    RefusePair(attributes[firstPair.first], attributes[firstPair.second]);
  }
}

/// Fills `m_order` with the indices of the attributes, sorted by local name, prefix and position.
void NamespaceScope::SortByName(const std::vector<AttributeEvent> &attributes) {
  const auto sortKey = [&attributes](std::size_t index) {
    const AttributeEvent &attribute = attributes[index];
    return std::make_tuple(attribute.GetLocalName(), attribute.GetPrefix(), index);
  };
  m_order.resize(attributes.size());
  std::iota(m_order.begin(), m_order.end(), std::size_t{0});
  std::sort(m_order.begin(), m_order.end(),
            [&sortKey](std::size_t a, std::size_t b) { return sortKey(a) < sortKey(b); });
}

/// The forbidden pair whose second attribute comes first, among the attributes of one local name from `begin` to `end` in
/// `m_order`; `UNKNOWN` twice if there is none.
NamespaceScope::AttributePair NamespaceScope::FindPair(const std::vector<AttributeEvent> &attributes,
                                                       OrderIterator begin, OrderIterator end) {
  AttributePair firstPair{UNKNOWN, UNKNOWN};
  std::vector<std::pair<std::size_t, std::size_t>> inNamespaces; // namespace and attribute
  for (auto next = begin; next != end; ++next) {
    if (next != begin && attributes[*next].name == attributes[*(next - 1)].name) {
      firstPair = std::min(firstPair, {*(next - 1), *next});
      continue;
    }
    const std::size_t found = FindNamespace(attributes[*next].GetPrefix());
    if (found != UNKNOWN) {
      inNamespaces.emplace_back(found, *next);
    }
  }
  std::sort(inNamespaces.begin(), inNamespaces.end());
  for (std::size_t i = 1; i < inNamespaces.size(); ++i) {
    if (inNamespaces[i - 1].first == inNamespaces[i].first) {
      firstPair = std::min(firstPair, {inNamespaces[i - 1].second, inNamespaces[i].second});
    }
  }
  return firstPair;
}

/// The declaration that represents the namespace that `prefix` is bound to; `UNKNOWN` when `prefix` is empty or not
/// bound.
std::size_t NamespaceScope::FindNamespace(std::string_view prefix) {
  if (prefix.empty()) {
    return UNKNOWN;
  }
  for (std::size_t i = m_declarations.size(); i > 0; --i) {
    if (m_declarations[i - 1].prefix == prefix) {
      return FindRepresentative(i - 1);
    }
  }
  return UNKNOWN;
}

// Namespace names may be long and are needed often, so they are compared only once for each declaration.
std::size_t NamespaceScope::FindRepresentative(std::size_t declaration) {
  std::size_t &representative = m_declarations[declaration].representative;
  if (representative == UNKNOWN) {
    const std::string_view name = m_declarations[declaration].GetNamespace();
    const auto same = std::find_if(m_declarations.begin(), m_declarations.end(),
                                   [name](const Declaration &other) { return other.GetNamespace() == name; });
    representative = static_cast<std::size_t>(same - m_declarations.begin());
  }
  return representative;
}

} // namespace Tarvel::Xml
