// SPDX-License-Identifier: Apache-2.0
/// @file
/// The options that a command adds to its command line. Files that only add options need this header and not CLI11's,
/// which takes seconds to compile.

#pragma once

#include <boost/optional.hpp>

#include <chrono>
#include <cstdint>
#include <string>
#include <vector>

namespace CLI {
class App;
class Option;
} // namespace CLI

namespace SsoClient::Tool {

/// Refers to an option of a command, which the command owns. Cheap to copy; valid while the command lives. Each
/// function changes the option and returns it.
class Option {
public:
  explicit Option(CLI::Option &option) : m_option(&option) {}

  /// A command line without the option is refused.
  Option Required() const;
  /// The name of the option's argument in the help.
  Option TypeName(const std::string &name) const;
  /// The heading under which the help lists the option.
  Option Group(const std::string &name) const;
  /// The help shows the variable's current value as the default.
  Option ShowDefault() const;
  /// The argument is a number from `least` to `most`.
  Option Within(std::int64_t least, std::int64_t most) const;
  /// The argument is one of `choices`.
  Option OneOf(const std::vector<std::string> &choices) const;
  /// A command line with this option and without `other` is refused.
  Option Needs(const Option &other) const;
  /// A command line with both options is refused.
  Option Excludes(const Option &other) const;

private:
  CLI::Option *m_option;
};

/// Returns what is wrong with the argument of an option, or an empty text. Every option refuses an empty argument: it
/// is most often a shell variable that is not set, and must not mean the same as an option that is not given.
std::string RefuseEmpty(const std::string &argument);

/// Adds an option with an argument that is stored in `value`, or a positional argument when `name` has no dashes.
/// Without the option, `value` stays as it is. `value` outlives the command. Numbers are decimal; a refusal does not
/// repeat the argument, since it may be a secret in the wrong place.
Option AddOption(CLI::App &command, const std::string &name, std::string &value, const std::string &help);
Option AddOption(CLI::App &command, const std::string &name, int &value, const std::string &help);
Option AddOption(CLI::App &command, const std::string &name, std::int64_t &value, const std::string &help);
/// The same for a time in seconds, a decimal number such as 2.5, from 0.001 to 86400 (a day).
Option AddOption(CLI::App &command, const std::string &name, boost::optional<std::chrono::microseconds> &value,
                 const std::string &help);
/// The same for an option that may be given more than once, with one argument each time.
Option AddOption(CLI::App &command, const std::string &name, std::vector<std::string> &values, const std::string &help);

/// Adds an option without an argument, which sets `value`.
Option AddFlag(CLI::App &command, const std::string &name, bool &value, const std::string &help);

} // namespace SsoClient::Tool
