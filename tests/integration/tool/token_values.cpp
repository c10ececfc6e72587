// SPDX-License-Identifier: Apache-2.0

#include "token_values.h"

#include <iterator>
#include <regex>
#include <stdexcept>

namespace ToolTest {

std::string AttributeIn(const std::string &xml, const std::string &name) {
  const std::string start = name + "=\"";
  // A blank or the colon of a prefix must precede the name; otherwise it is the end of a longer name.
  for (std::size_t at = xml.find(start, 1); at != std::string::npos; at = xml.find(start, at + 1)) {
    const std::size_t begin = at + start.size();
    const std::size_t end = xml.find('"', begin);
    if ((xml[at - 1] == ' ' || xml[at - 1] == ':') && end != std::string::npos) {
      return xml.substr(begin, end - begin);
    }
  }
  throw std::runtime_error("no attribute " + name + " in " + xml);
}

std::string Fill(std::string text, const std::string &mark, const std::string &value) {
  for (std::size_t at = text.find(mark); at != std::string::npos; at = text.find(mark, at + value.size())) {
    text.replace(at, mark.size(), value);
  }
  return text;
}

std::string FillFrom(const std::string &xml, std::string text) {
  text = Fill(text, "@ID@", AttributeIn(xml, "ID"));
  const std::string conditions = xml.substr(xml.find("Conditions "));
  text = Fill(text, "@NOT_BEFORE@", AttributeIn(conditions, "NotBefore"));
  return Fill(text, "@NOT_ON_OR_AFTER@", AttributeIn(conditions, "NotOnOrAfter"));
}

std::string WithoutDistances(const std::string &text) {
  static const std::regex DISTANCE(
      R"(\n(Not before:      |Not on or after: )([^ \n]+) \((now|in [0-9a-z ]+|[0-9a-z ]+ ago)\))");
  const auto count = std::distance(std::sregex_iterator(text.begin(), text.end(), DISTANCE), std::sregex_iterator());
  if (count != 2) {
    throw std::runtime_error("not two times with a distance in " + text);
  }
  return std::regex_replace(text, DISTANCE, "\n$1$2");
}

} // namespace ToolTest
