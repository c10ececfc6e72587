// SPDX-License-Identifier: Apache-2.0
/// @file
/// The options that a text lists, such as the help of a command.

#pragma once

#include <set>
#include <string>

namespace ToolTest {

/// The long options that the text has right after `start`, also those after a short option and `separator`.
std::set<std::string> OptionsBehind(const std::string &start, const std::string &text, const std::string &separator);

/// The options that begin an indented line of a command's help.
std::set<std::string> OptionsOfHelp(const std::string &command);

/// The options in a command's help that take an argument.
std::set<std::string> OptionsWithArgument(const std::string &command);

} // namespace ToolTest
