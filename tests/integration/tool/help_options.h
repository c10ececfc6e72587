// SPDX-License-Identifier: Apache-2.0
/// @file
/// The options in a text such as the help of a command.

#pragma once

#include <set>
#include <string>

namespace ToolTest {

/// The long options directly after each `start` in `text`, with or without a short option and `separator` in between.
std::set<std::string> OptionsAfter(const std::string &start, const std::string &text, const std::string &separator);

/// The options that begin an indented line of a command's help.
std::set<std::string> OptionsOfHelp(const std::string &command);

/// The options in a command's help that take an argument.
std::set<std::string> OptionsWithArgument(const std::string &command);

} // namespace ToolTest
