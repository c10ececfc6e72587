// SPDX-License-Identifier: Apache-2.0

#include "http/header_syntax.h"

#include <algorithm>

namespace Tarvel::Http {

namespace {

bool IsTokenCharacter(char c) noexcept {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
         (c != '\0' && std::string_view("!#$%&'*+-.^_`|~").find(c) != std::string_view::npos);
}

} // namespace

bool IsControlCharacter(char c) noexcept {
  const auto byte = static_cast<unsigned char>(c);
  return byte < 0x20 || byte == 0x7F;
}

bool IsToken(std::string_view text) noexcept {
  return !text.empty() && std::all_of(text.begin(), text.end(), IsTokenCharacter);
}

bool IsFieldValue(std::string_view text) noexcept {
  return std::none_of(text.begin(), text.end(), IsControlCharacter);
}

std::string_view TrimBlanks(std::string_view text) noexcept {
  const std::size_t first = text.find_first_not_of(" \t");
  if (first == std::string_view::npos) {
    return {};
  }
  return text.substr(first, text.find_last_not_of(" \t") - first + 1);
}

} // namespace Tarvel::Http
