// SPDX-License-Identifier: Apache-2.0

#include "option.h"

#include <CLI/CLI.hpp>

#include <charconv>
#include <system_error>

namespace SsoClient::Tool {
namespace {

using std::chrono::microseconds;

constexpr const char *DIGITS = "0123456789";
constexpr std::int64_t MAX_SECONDS = 24 * 60 * 60;

/// Replaces the decimal number in `argument` with its shortest form. Returns what is wrong with it, or an empty text.
std::string NormaliseNumber(std::string &argument) {
  if (argument.empty()) {
    return RefuseEmpty(argument);
  }
  std::int64_t number = 0;
  const char *const end = argument.data() + argument.size();
  const auto [parsed, error] = std::from_chars(argument.data(), end, number);
  if (parsed != end || error == std::errc::invalid_argument) {
    return "must be a whole number";
  }
  if (error != std::errc()) {
    return "is out of range";
  }
  argument = std::to_string(number);
  return {};
}

/// Accepts the "true" that the parser stores for a flag, and refuses any other text that follows the flag after "=".
std::string RefuseArgument(const std::string &argument) {
  return argument == "true" ? "" : "takes no argument";
}

/// The time in `text`, a decimal number of seconds; `boost::none` for any other text, and for a time out of range.
boost::optional<microseconds> ParseSeconds(const std::string &text) {
  const std::size_t whole = text.find_first_not_of(DIGITS);
  const bool hasFraction = whole != std::string::npos && text[whole] == '.';
  const std::string fraction = hasFraction ? text.substr(whole + 1) : "";
  const bool isNumber = hasFraction ? !fraction.empty() && fraction.find_first_not_of(DIGITS) == std::string::npos
                                    : whole == std::string::npos;
  if (text.empty() || whole == 0 || !isNumber) {
    return boost::none;
  }
  std::int64_t seconds = 0;
  if (std::from_chars(text.data(), text.data() + text.size(), seconds).ec != std::errc()) {
    return boost::none;
  }
  const std::int64_t parts = std::stoll((fraction + "000000").substr(0, 6));
  const bool isMore = seconds == MAX_SECONDS && (parts > 0 || fraction.find_first_not_of('0') != std::string::npos);
  if (seconds > MAX_SECONDS || isMore || (seconds == 0 && parts < 1'000)) {
    return boost::none;
  }
  return std::chrono::seconds(seconds) + microseconds(parts);
}

Option AddNumber(CLI::Option &option) {
  // Without this, the parser would read a number with a leading 0 as octal.
  option.transform(CLI::Validator(NormaliseNumber, ""));
  return Option(option);
}

} // namespace

std::string RefuseEmpty(const std::string &argument) {
  return argument.empty() ? "must not be empty" : "";
}

Option Option::Required() const {
  m_option->required();
  return *this;
}

Option Option::TypeName(const std::string &name) const {
  m_option->type_name(name);
  return *this;
}

Option Option::Group(const std::string &name) const {
  m_option->group(name);
  return *this;
}

Option Option::ShowDefault() const {
  m_option->capture_default_str();
  return *this;
}

Option Option::Within(std::int64_t least, std::int64_t most) const {
  m_option->check([least, most](const std::string &argument) -> std::string {
    const std::int64_t number = std::stoll(argument); // a number in its shortest form
    if (least <= number && number <= most) {
      return {};
    }
    return "must be a number from " + std::to_string(least) + " to " + std::to_string(most);
  });
  return *this;
}

Option Option::OneOf(const std::vector<std::string> &choices) const {
  m_option->check(CLI::IsMember(choices));
  return *this;
}

Option Option::Needs(const Option &other) const {
  m_option->needs(other.m_option);
  return *this;
}

Option Option::Excludes(const Option &other) const {
  m_option->excludes(other.m_option);
  return *this;
}

Option AddOption(CLI::App &command, const std::string &name, std::string &value, const std::string &help) {
  return Option(*command.add_option(name, value, help)->check(RefuseEmpty));
}

Option AddOption(CLI::App &command, const std::string &name, int &value, const std::string &help) {
  return AddNumber(*command.add_option(name, value, help));
}

Option AddOption(CLI::App &command, const std::string &name, std::int64_t &value, const std::string &help) {
  return AddNumber(*command.add_option(name, value, help));
}

Option AddOption(CLI::App &command, const std::string &name, boost::optional<microseconds> &value,
                 const std::string &help) {
  const auto take = [&value](const CLI::results_t &arguments) {
    value = ParseSeconds(arguments.front());
    return true;
  };
  CLI::Option *const option = command.add_option(name, take, help);
  option->expected(1)->check(RefuseEmpty)->check([](const std::string &argument) -> std::string {
    return ParseSeconds(argument) ? "" : "must be a number of seconds from 0.001 to " + std::to_string(MAX_SECONDS);
  });
  return Option(*option);
}

Option AddOption(CLI::App &command, const std::string &name, std::vector<std::string> &values,
                 const std::string &help) {
  // Stores the arguments unchanged: the parser's conversion to a vector gives "{}" and "%%" a special meaning.
  const auto take = [&values](const CLI::results_t &arguments) {
    values = arguments;
    return true;
  };
  CLI::Option *const option = command.add_option(name, take, help);
  option->expected(1, CLI::detail::expected_max_vector_size)->allow_extra_args(false)->check(RefuseEmpty);
  return Option(*option);
}

Option AddFlag(CLI::App &command, const std::string &name, bool &value, const std::string &help) {
  return Option(*command.add_flag(name, value, help)->check(RefuseArgument));
}

} // namespace SsoClient::Tool
