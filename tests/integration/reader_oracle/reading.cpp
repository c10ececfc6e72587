// SPDX-License-Identifier: Apache-2.0

#include "reading.h"

namespace Testing {

void EventText::Attribute(std::string_view name, std::string_view value) {
  Add('\x02', name);
  Add('\x03', value);
}

void EventText::Characters(std::string_view text) {
  if (text.empty()) {
    return;
  }
  if (m_isInText) {
    m_text += text;
    return;
  }
  Add('\x05', text);
  m_isInText = true;
}

void EventText::ProcessingInstruction(std::string_view target, std::string_view data) {
  Add('\x07', target);
  Add('\x08', data);
}

void EventText::Add(char kind, std::string_view text) {
  m_text += kind;
  m_text += text;
  m_isInText = false;
}

std::size_t OffsetOf(std::string_view document, std::uint32_t line, std::uint32_t column) {
  std::size_t begin = document.substr(0, 3) == "\xEF\xBB\xBF" ? 3 : 0;
  for (std::uint32_t counted = 1; counted < line; ++counted) {
    const std::size_t lineBreak = document.find('\n', begin);
    if (lineBreak == std::string_view::npos) {
      return document.size() + 1;
    }
    begin = lineBreak + 1;
  }
  return begin + column - 1;
}

bool IsDeclaration(std::string_view name) {
  return name.substr(0, 5) == "xmlns" && (name.size() == 5 || name[5] == ':');
}

} // namespace Testing
