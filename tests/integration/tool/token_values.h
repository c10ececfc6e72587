// SPDX-License-Identifier: Apache-2.0
/// @file
/// What differs from token to token, taken from its XML.

#pragma once

#include <regex>
#include <stdexcept>
#include <string>

namespace ToolTest {

/// The value of the first attribute `name` in `xml`.
inline std::string AttributeIn(const std::string &xml, const std::string &name) {
  std::smatch match;
  if (!std::regex_search(xml, match, std::regex("[ :]" + name + "=\"([^\"]*)\""))) {
    throw std::runtime_error("no attribute " + name + " in " + xml);
  }
  return match[1];
}

/// `text` with each `mark` replaced by `value`.
inline std::string Fill(std::string text, const std::string &mark, const std::string &value) {
  for (std::size_t at = text.find(mark); at != std::string::npos; at = text.find(mark, at + value.size())) {
    text.replace(at, mark.size(), value);
  }
  return text;
}

/// `text` with @ID@, @NOT_BEFORE@ and @NOT_ON_OR_AFTER@ replaced by the values of the token `xml`. The validity stands in
/// the element Conditions; a bearer token has a further end of its own in its confirmation.
inline std::string FillFrom(const std::string &xml, std::string text) {
  text = Fill(text, "@ID@", AttributeIn(xml, "ID"));
  const std::string conditions = xml.substr(xml.find("Conditions "));
  text = Fill(text, "@NOT_BEFORE@", AttributeIn(conditions, "NotBefore"));
  return Fill(text, "@NOT_ON_OR_AFTER@", AttributeIn(conditions, "NotOnOrAfter"));
}

} // namespace ToolTest
