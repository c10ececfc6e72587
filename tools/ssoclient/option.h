// SPDX-License-Identifier: Apache-2.0
/// @file
/// The options that a command adds to its command line. Files that only add options need this header and not CLI11's,
/// which takes seconds to compile.

#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace CLI {
class App;
class Option;
} // namespace CLI

namespace SsoClient::Tool {

/// An option of a command. The command owns it; this only refers to it, is cheap to copy, and is valid while the
/// command lives. Each function changes the option and returns it.
class Option {
public:
  explicit Option(CLI::Option &option) : m_option(&option) {}

  /// A command line without the option is wrong.
  Option Required() const;
  /// What the help calls the option's argument.
  Option TypeName(const std::string &name) const;
  /// The heading of the help that the option is listed under.
  Option Group(const std::string &name) const;
  /// The help shows what the option's variable holds now.
  Option ShowDefault() const;
  /// The argument is a number from `least` to `most`.
  Option Within(std::int64_t least, std::int64_t most) const;
  /// A command line with this option and without `other` is wrong.
  Option Needs(const Option &other) const;
  /// A command line with both options is wrong.
  Option Excludes(const Option &other) const;

private:
  CLI::Option *m_option;
};

/// What is wrong with the argument of an option; empty for nothing. An empty argument is wrong everywhere: it is most often
/// a shell's variable that is not set, and must not mean the same as an option that is not given.
std::string RefuseEmpty(const std::string &argument);

/// Adds an option with an argument that is stored in `value`, or a positional argument when `name` has no dashes.
/// When it is not given, `value` keeps what it holds. `value` outlives the command. A number is decimal; what is not a
/// number is refused without being repeated, since it may be a secret in the wrong place.
Option AddOption(CLI::App &command, const std::string &name, std::string &value, const std::string &help);
Option AddOption(CLI::App &command, const std::string &name, int &value, const std::string &help);
Option AddOption(CLI::App &command, const std::string &name, std::int64_t &value, const std::string &help);
/// The same for an option that may be given again. It takes one argument each time.
Option AddOption(CLI::App &command, const std::string &name, std::vector<std::string> &values, const std::string &help);

/// Adds an option without an argument, which sets `value`.
Option AddFlag(CLI::App &command, const std::string &name, bool &value, const std::string &help);

} // namespace SsoClient::Tool
