// SPDX-License-Identifier: Apache-2.0

#include "option.h"

#include <CLI/CLI.hpp>

namespace SsoClient::Tool {

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

Option Option::Within(int least, int most) const {
  m_option->check(CLI::Range(least, most));
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
  return Option(*command.add_option(name, value, help));
}

Option AddOption(CLI::App &command, const std::string &name, int &value, const std::string &help) {
  return Option(*command.add_option(name, value, help));
}

Option AddOption(CLI::App &command, const std::string &name, std::int64_t &value, const std::string &help) {
  return Option(*command.add_option(name, value, help));
}

Option AddOption(CLI::App &command, const std::string &name, std::vector<std::string> &values,
                 const std::string &help) {
  return Option(*command.add_option(name, values, help)->allow_extra_args(false));
}

Option AddFlag(CLI::App &command, const std::string &name, bool &value, const std::string &help) {
  return Option(*command.add_flag(name, value, help));
}

} // namespace SsoClient::Tool
