// SPDX-License-Identifier: Apache-2.0

#include "help_options.h"

#include "process.h"

#include <cstddef>

namespace ToolTest {
namespace {

/// The long option at `at`, including its "--", possibly after a short option and `separator`; empty when there is
/// none.
std::string OptionAt(const std::string &text, std::size_t at, const std::string &separator) {
  const bool isShort = text[at] == '-' && text[at + 1] >= 'a' && text[at + 1] <= 'z';
  if (isShort && text.compare(at + 2, separator.size(), separator) == 0) {
    at += 2 + separator.size();
  }
  const std::size_t end = text.find_first_not_of("-0123456789abcdefghijklmnopqrstuvwxyz", at);
  const std::string option = text.substr(at, end - at);
  return option.find("--") == 0 && option != "--" ? option : "";
}

} // namespace

std::set<std::string> OptionsAfter(const std::string &start, const std::string &text, const std::string &separator) {
  std::set<std::string> options;
  for (std::size_t at = text.find(start); at != std::string::npos; at = text.find(start, at + 1)) {
    options.insert(OptionAt(text, at + start.size(), separator));
  }
  options.erase("");
  return options;
}

std::set<std::string> OptionsOfHelp(const std::string &command) {
  return OptionsAfter("\n  ", RunTool({command, "--help"}).out, ",");
}

std::set<std::string> OptionsWithArgument(const std::string &command) {
  const std::string help = RunTool({command, "--help"}).out;
  std::set<std::string> options;
  for (const std::string &option : OptionsOfHelp(command)) {
    // The name of an argument follows at once, in capitals. A flag has only its description, in a later column.
    const std::size_t end = help.find(option + " ") + option.size();
    if (help[end + 1] >= 'A' && help[end + 1] <= 'Z') {
      options.insert(option);
    }
  }
  return options;
}

} // namespace ToolTest
