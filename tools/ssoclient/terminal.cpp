// SPDX-License-Identifier: Apache-2.0

#include "terminal.h"

#include <cstdlib>

#include <sys/ioctl.h>
#include <unistd.h>

namespace SsoClient::Tool {
namespace {

/// The value of a variable of the environment; empty when it is missing.
std::string_view GetVariable(const char *name) {
  const char *const value = std::getenv(name); // nothing in the process changes its environment
  return value ? value : "";
}

/// The "select graphic rendition" sequence (ECMA-48) of the colour; empty for NONE.
std::string_view SequenceOf(Colour colour) {
  switch (colour) {
  case Colour::GREEN:
    return "\x1b[32m";
  case Colour::YELLOW:
    return "\x1b[33m";
  case Colour::RED:
    return "\x1b[31m";
  case Colour::BOLD:
    return "\x1b[1m";
  case Colour::NONE:
    break;
  }
  return "";
}

} // namespace

bool UsesColour(int descriptor) {
  return isatty(descriptor) == 1 && GetVariable("NO_COLOR").empty() && GetVariable("TERM") != "dumb";
}

std::string Coloured(std::string_view text, Colour colour, bool usesColour) {
  const std::string_view sequence = SequenceOf(colour);
  if (!usesColour || sequence.empty()) {
    return std::string(text);
  }
  return std::string(sequence).append(text).append("\x1b[0m");
}

std::size_t GetWidth(int descriptor) {
  winsize size = {};
  return ioctl(descriptor, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col : DEFAULT_WIDTH;
}

} // namespace SsoClient::Tool
