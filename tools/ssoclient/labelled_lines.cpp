// SPDX-License-Identifier: Apache-2.0

#include "labelled_lines.h"

#include "output.h"

namespace SsoClient::Tool {

void LabelledLines::Add(std::string_view label, std::string_view value) {
  m_text += label;
  m_text.append(label.size() < COLUMN ? COLUMN - label.size() : 1, ' ');
  m_text += PrintableValue(value);
  m_text += '\n';
}

void LabelledLines::AddUnlessEmpty(std::string_view label, std::string_view value) {
  if (!value.empty()) {
    Add(label, value);
  }
}

} // namespace SsoClient::Tool
