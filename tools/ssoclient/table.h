// SPDX-License-Identifier: Apache-2.0
/// @file
/// A table for people, wrapped to the width of the terminal.

#pragma once

#include "terminal_style.h"

#include <array>
#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient::Tool {

/// Breaks `text` into lines of at most `width` characters. Lines are broken at blanks. A word is broken only if it is
/// longer than a line, if possible after a separator of paths and URIs. A line feed in `text` ends a line, too. If a
/// line begins with blanks, the lines into which it is broken are all indented in the same way. Returns at least one
/// line.
/// @param width at least 1
std::vector<std::string> Wrap(std::string_view text, std::size_t width);

/// One cell of a table: printable text, with line feeds where a line must end.
struct Cell {
  std::string text;
  Colour colour = Colour::NONE;
};

/// A table of four columns. The first two are as wide as their longest cells. The other two share the rest of the
/// width, and their cells are wrapped.
class Table {
public:
  static constexpr std::size_t COLUMNS = 4;
  using Row = std::array<Cell, COLUMNS>;

  /// A table with a row of headings.
  explicit Table(const std::array<std::string_view, COLUMNS> &headings);

  void Add(Row row);

  /// The table in lines without blanks at their ends.
  std::string Write(const TextStyle &style) const;

private:
  std::array<std::size_t, COLUMNS> WidthsFor(std::size_t width) const;

  std::vector<Row> m_rows;
};

} // namespace SsoClient::Tool
