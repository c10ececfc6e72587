// SPDX-License-Identifier: Apache-2.0

#include "table.h"

#include <algorithm>
#include <utility>

namespace SsoClient::Tool {
namespace {

constexpr std::size_t GAP = 2; // blanks between two columns
constexpr std::size_t LEAST_SHARE = 12;
constexpr std::size_t FOUND = 2;
constexpr std::size_t ADVICE = 3;

bool ContinuesCharacter(char octet) noexcept {
  return (static_cast<unsigned char>(octet) & 0xC0u) == 0x80u;
}

/// The number of characters of UTF-8 text. Each counts as one column, which is right for most languages.
std::size_t CountCharacters(std::string_view text) noexcept {
  return static_cast<std::size_t>(
      std::count_if(text.begin(), text.end(), [](char octet) { return !ContinuesCharacter(octet); }));
}

/// The octets of the first `count` characters of `text`.
std::size_t OctetsOf(std::string_view text, std::size_t count) noexcept {
  std::size_t octets = 0;
  for (; octets < text.size(); ++octets) {
    if (!ContinuesCharacter(text[octets])) {
      if (count == 0) {
        break;
      }
      --count;
    }
  }
  return octets;
}

/// How many octets of `text` the first line gets, at most `most`: up to a blank; in a word that is longer than a line,
/// such as a path or a URI, up to and including a separator in the line's second half; otherwise `most`.
std::size_t PlaceToBreak(std::string_view text, std::size_t most) noexcept {
  // A blank right after a full line is a place to break, too.
  const std::size_t blank = text.substr(0, most + 1).rfind(' ');
  if (blank != std::string_view::npos && blank > 0) {
    return blank;
  }
  const std::size_t separator = text.substr(0, most).find_last_of("/:#");
  return separator != std::string_view::npos && separator >= most / 2 ? separator + 1 : most;
}

/// Wraps `text`, which has no line feed, and adds its lines to `lines`, all indented like `text`.
void WrapLine(std::string_view text, std::size_t width, std::vector<std::string> &lines) {
  const std::size_t blanks = std::min(text.find_first_not_of(' '), text.size());
  const std::string indent(blanks < width / 2 ? blanks : 0, ' ');
  text.remove_prefix(indent.size());
  while (true) {
    const std::size_t most = OctetsOf(text, width - indent.size());
    if (most == text.size()) {
      lines.push_back(indent + std::string(text));
      return;
    }
    const std::size_t end = PlaceToBreak(text, most);
    lines.push_back(indent + std::string(text.substr(0, end)));
    text.remove_prefix(text[end] == ' ' ? end + 1 : end);
  }
}

std::size_t WidestLine(std::string_view text) noexcept {
  std::size_t widest = 0;
  while (true) {
    const std::size_t end = text.find('\n');
    widest = std::max(widest, CountCharacters(text.substr(0, end)));
    if (end == std::string_view::npos) {
      return widest;
    }
    text.remove_prefix(end + 1);
  }
}

void WriteRow(const Table::Row &row, const std::array<std::size_t, Table::COLUMNS> &widths, bool hasColours,
              std::string &out) {
  std::array<std::vector<std::string>, Table::COLUMNS> cells;
  std::size_t height = 0;
  for (std::size_t column = 0; column < Table::COLUMNS; ++column) {
    cells[column] = Wrap(row[column].text, std::max<std::size_t>(widths[column], 1));
    height = std::max(height, cells[column].size());
  }
  for (std::size_t line = 0; line < height; ++line) {
    std::size_t blanks = 0; // written only before more text
    for (std::size_t column = 0; column < Table::COLUMNS; ++column) {
      const std::string text = line < cells[column].size() ? cells[column][line] : std::string();
      if (!text.empty()) {
        out.append(blanks, ' ');
        blanks = 0;
        out += Coloured(text, row[column].colour, hasColours);
      }
      blanks += widths[column] - CountCharacters(text) + GAP;
    }
    out += '\n';
  }
}

} // namespace

std::vector<std::string> Wrap(std::string_view text, std::size_t width) {
  std::vector<std::string> lines;
  while (true) {
    const std::size_t end = text.find('\n');
    WrapLine(text.substr(0, end), width, lines);
    if (end == std::string_view::npos) {
      return lines;
    }
    text.remove_prefix(end + 1);
  }
}

Table::Table(const std::array<std::string_view, COLUMNS> &headings) {
  Row row;
  for (std::size_t column = 0; column < COLUMNS; ++column) {
    row[column].text = headings[column];
  }
  Add(std::move(row));
}

void Table::Add(Row row) {
  m_rows.push_back(std::move(row));
}

std::string Table::Write(const TextStyle &style) const {
  const std::array<std::size_t, COLUMNS> widths = WidthsFor(style.width);
  std::string out;
  for (const Row &row : m_rows) {
    WriteRow(row, widths, style.hasColours, out);
  }
  return out;
}

std::array<std::size_t, Table::COLUMNS> Table::WidthsFor(std::size_t width) const {
  std::array<std::size_t, COLUMNS> widths{};
  for (const Row &row : m_rows) {
    for (std::size_t column = 0; column < COLUMNS; ++column) {
      widths[column] = std::max(widths[column], WidestLine(row[column].text));
    }
  }
  const std::size_t taken = widths[0] + widths[1] + 3 * GAP;
  const std::size_t left = std::max(width, taken + 2 * LEAST_SHARE) - taken;
  if (widths[FOUND] + widths[ADVICE] > left) {
    // Three fifths and two fifths, unless one of the two columns needs less.
    const std::size_t share = left * 3 / 5;
    if (widths[FOUND] <= share) {
      widths[ADVICE] = left - widths[FOUND];
    } else {
      widths[ADVICE] = std::min(widths[ADVICE], left - share);
      widths[FOUND] = left - widths[ADVICE];
    }
  }
  return widths;
}

} // namespace SsoClient::Tool
