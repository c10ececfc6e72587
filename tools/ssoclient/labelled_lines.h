// SPDX-License-Identifier: Apache-2.0
/// @file
/// Lines of a label and a value.

#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace SsoClient::Tool {

/// Collects lines of a label and a value, with the values in one column. Values are made printable and cut
/// (`PrintableValue`).
class LabelledLines {
public:
  void Add(std::string_view label, std::string_view value);
  void AddUnlessEmpty(std::string_view label, std::string_view value);

  const std::string &Get() const noexcept { return m_text; }

private:
  static constexpr std::size_t COLUMN = 17;
  std::string m_text;
};

} // namespace SsoClient::Tool
