// SPDX-License-Identifier: Apache-2.0
/// @file
/// How text for people is laid out: its width, and whether it has colours.

#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace SsoClient::Tool {

/// The colours of text on a terminal, which are those of its own palette.
enum class Colour { NONE, GREEN, RED, YELLOW, BOLD };

/// What decides the layout.
struct TerminalFacts {
  bool isTerminal = false;
  std::size_t columns = 0;               ///< of the terminal; 0: not known
  const char *columnsVariable = nullptr; ///< COLUMNS; null: not set
  const char *noColour = nullptr;        ///< NO_COLOR; null: not set
  const char *terminalType = nullptr;    ///< TERM; null: not set
};

struct TextStyle {
  std::size_t width = 0; ///< in characters
  bool hasColours = false;
};

/// The width is COLUMNS if that is a number greater than 0, otherwise the terminal's width, otherwise 100. A width
/// below 60 becomes 60, and a width above 1,000 becomes 1,000. Text is coloured only on a terminal, and not if NO_COLOR
/// is set and not empty, or if TERM is "dumb".
TextStyle ChooseStyle(const TerminalFacts &facts) noexcept;

/// The style of text that is written to the descriptor.
TextStyle StyleOf(int descriptor) noexcept;

/// `text` with the sequences that colour it; unchanged if `hasColours` is false, or there is nothing to colour.
/// @param text printable
std::string Coloured(std::string_view text, Colour colour, bool hasColours);

} // namespace SsoClient::Tool
