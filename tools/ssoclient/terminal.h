// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the tool writes for people depends on where the text goes: colour, and the width of a line.

#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace SsoClient::Tool {

/// The colour of a word. The colours are those of the terminal's own palette.
enum class Colour { NONE, GREEN, YELLOW, RED, BOLD };

/// The width of a line when the output is not a terminal, or the terminal does not say its own.
constexpr std::size_t DEFAULT_WIDTH = 80;

/// Whether text for the descriptor is coloured: it is a terminal that can show colour, and the environment's variable
/// NO_COLOR is empty or missing.
bool UsesColour(int descriptor);

/// `text` in the colour, or unchanged when `usesColour` is false or the colour is NONE. `text` must be printable: it may
/// contain nothing that controls a terminal.
std::string Coloured(std::string_view text, Colour colour, bool usesColour);

/// The number of columns of the terminal at the descriptor; `DEFAULT_WIDTH` when it is not known.
std::size_t GetWidth(int descriptor);

} // namespace SsoClient::Tool
