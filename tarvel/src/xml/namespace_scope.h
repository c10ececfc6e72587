// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NamespaceScope`, the rules of Namespaces in XML 1.0 for start tags.

#pragma once

#include "xml/source_cursor.h"

#include <tarvel/xml/parser.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

namespace Tarvel::Xml {

/// The declarations in scope, and the rules that need them. An unbound prefix is not refused here.
class NamespaceScope {
public:
  explicit NamespaceScope(const SourceCursor &cursor) : m_cursor(cursor) { m_declarations.reserve(8); }

  /// Enters an element.
  /// @param tag where its start tag begins.
  /// @return the number of its declarations, which `Leave` needs.
  /// @throws XMLParseException when two attributes have the same name, a declaration is not allowed, or too many are in scope.
  std::size_t Enter(const char *tag, const WrittenName &name, const std::vector<AttributeEvent> &attributes);

  /// Leaves the element that was entered last. `declarations` is what `Enter` returned for that element.
  void Leave(std::size_t declarations) noexcept { m_declarations.resize(m_declarations.size() - declarations); }

private:
  static constexpr std::size_t UNKNOWN = static_cast<std::size_t>(-1);

  struct Declaration {
    std::string_view prefix;
    std::string_view written;             // the namespace name, as a view of the source, if nothing was replaced in it
    std::string replaced;                 // the namespace name otherwise
    std::size_t representative = UNKNOWN; // the first declaration of the same namespace name; unknown until needed

    std::string_view GetNamespace() const noexcept { return replaced.empty() ? written : replaced; }
  };

  using OrderIterator = std::vector<std::size_t>::const_iterator;

  /// Two attributes of one element, by index; ordered by the second, then by the first.
  struct AttributePair {
    std::size_t first;
    std::size_t second;

    bool operator<(const AttributePair &other) const noexcept {
      return std::tie(second, first) < std::tie(other.second, other.first);
    }
  };

  void Declare(const AttributeEvent &declaration);
  void CheckDeclaration(const AttributeEvent &declaration, std::string_view prefix);
  void CheckNames(const std::vector<AttributeEvent> &attributes);
  void CheckFewNames(const std::vector<AttributeEvent> &attributes);
  void CheckManyNames(const std::vector<AttributeEvent> &attributes);
  void SortByName(const std::vector<AttributeEvent> &attributes);
  AttributePair FindPair(const std::vector<AttributeEvent> &attributes, OrderIterator begin, OrderIterator end);
  [[noreturn]] void RefusePair(const AttributeEvent &first, const AttributeEvent &second) const;
  std::size_t FindNamespace(std::string_view prefix);
  std::size_t FindRepresentative(std::size_t declaration);

  const SourceCursor &m_cursor;
  std::vector<Declaration> m_declarations;
  std::vector<std::size_t> m_order; // the attributes of one element sorted by name, if they are many
  // The last names of namespaces that were found to be URI references. Documents declare a few names again and again. An
  // empty name is one, too.
  std::array<std::string_view, 8> m_knownNames{};
  std::size_t m_nextKnownName = 0;
};

} // namespace Tarvel::Xml
