// SPDX-License-Identifier: Apache-2.0

#include "terminal_style.h"

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <system_error>

#include <sys/ioctl.h>
#include <unistd.h>

namespace SsoClient::Tool {
namespace {

constexpr std::size_t DEFAULT_WIDTH = 100;
constexpr std::size_t LEAST_WIDTH = 60; // the columns of a table become unreadable below this
constexpr std::size_t GREATEST_WIDTH = 1000;

/// The number that the environment variable contains, or 0 if `value` is null or not a decimal number.
std::size_t NumberIn(const char *value) noexcept {
  const std::string_view text = value ? value : "";
  std::size_t number = 0;
  const char *const end = text.data() + text.size();
  const auto [parsed, error] = std::from_chars(text.data(), end, number);
  if (error == std::errc::result_out_of_range) {
    return GREATEST_WIDTH;
  }
  return error == std::errc() && parsed == end ? number : 0;
}

std::string_view CodeOf(Colour colour) noexcept {
  switch (colour) {
  case Colour::GREEN:
    return "\033[32m";
  case Colour::RED:
    return "\033[31m";
  case Colour::YELLOW:
    return "\033[33m";
  case Colour::BOLD:
    return "\033[1m";
  case Colour::NONE:
    break;
  }
  return {};
}

} // namespace

TextStyle ChooseStyle(const TerminalFacts &facts) noexcept {
  std::size_t width = NumberIn(facts.columnsVariable);
  if (width == 0) {
    width = facts.isTerminal && facts.columns > 0 ? facts.columns : DEFAULT_WIDTH;
  }
  TextStyle style;
  style.width = std::clamp(width, LEAST_WIDTH, GREATEST_WIDTH);
  const bool isUnwanted = facts.noColour && *facts.noColour != '\0';
  const bool isDumb = facts.terminalType && std::string_view(facts.terminalType) == "dumb";
  style.hasColours = facts.isTerminal && !isUnwanted && !isDumb;
  return style;
}

TextStyle StyleOf(int descriptor) noexcept {
  TerminalFacts facts;
  facts.isTerminal = isatty(descriptor) == 1;
  winsize size = {};
  if (facts.isTerminal && ioctl(descriptor, TIOCGWINSZ, &size) == 0) {
    facts.columns = size.ws_col;
  }
  facts.columnsVariable = std::getenv("COLUMNS");
  facts.noColour = std::getenv("NO_COLOR");
  facts.terminalType = std::getenv("TERM");
  return ChooseStyle(facts);
}

std::string Coloured(std::string_view text, Colour colour, bool hasColours) {
  const std::string_view code = CodeOf(colour);
  if (!hasColours || code.empty() || text.empty()) {
    return std::string(text);
  }
  return std::string(code) + std::string(text) + "\033[0m";
}

} // namespace SsoClient::Tool
