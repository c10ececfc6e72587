// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MarkupWriter`, which writes those parts of generated documents that do not depend on other parts.

#pragma once

#include "integration/signature_oracle/random_source.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

namespace Testing {

/// Writes a text of its own. In some texts nothing is odd, in others few or many pieces are.
class MarkupWriter {
public:
  explicit MarkupWriter(RandomSource &random);

  /// Whether to write something that is probably wrong here.
  bool IsOdd() { return m_oddity != 0 && m_random.OnceIn(m_oddity); }

  /// Whether the text has only few prefixes, namespaces and names, so that they coincide.
  bool IsNarrow() const { return m_isNarrow; }

  std::string_view Space();
  std::string Name();
  std::string AttributeValue();

  void Put(std::string_view text) { m_text += text; }
  void PutOptionalSpace();
  void PutText();
  void PutInstruction();
  void PutComment();
  void PutCData();
  void PutDeclaration();
  void PutAttribute(const std::string &name, std::string_view value);

  /// Writes what may be before or after the document element.
  void PutOutside();

  std::string Take() { return std::move(m_text); }

private:
  template <std::size_t COUNT>
  void PutPieces(const std::string_view (&pieces)[COUNT]);
  template <std::size_t COUNT>
  std::uint32_t Boundary(const std::uint32_t (&boundaries)[COUNT]);
  void PutCharacter();
  void PutValue(std::string_view value);
  void RemoveRuns(std::size_t begin);

  RandomSource &m_random;
  const std::size_t m_oddity; // one in this many pieces is odd; with 0, no piece is
  const bool m_isNarrow;
  std::string m_text;
};

} // namespace Testing
