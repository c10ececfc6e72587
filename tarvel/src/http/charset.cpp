// SPDX-License-Identifier: Apache-2.0

#include "http/charset.h"

#include "http/header_syntax.h"
#include "xml/characters.h"

#include <tarvel/core/secure_wipe.h>

#include <algorithm>
#include <array>
#include <cstddef>

namespace Tarvel::Http {

namespace {

constexpr std::size_t MAX_CHARSET_LENGTH = 40;
constexpr std::size_t MAX_DECLARATION_LENGTH = 256; // of an XML declaration; a longer one is not examined

constexpr std::string_view XML_SPACE = " \t\r\n";

constexpr std::array<std::string_view, 9> LATIN1_NAMES{
    "ISO-8859-1", "ISO_8859-1", "ISO_8859-1:1987", "iso-ir-100", "latin1", "l1", "IBM819", "CP819", "csISOLatin1"};

bool IsLatin1(std::string_view charset) {
  return std::any_of(LATIN1_NAMES.begin(), LATIN1_NAMES.end(),
                     [charset](std::string_view name) { return EqualsIgnoringCase(name, charset); });
}

bool IsBeyondAscii(char c) noexcept {
  return static_cast<unsigned char>(c) > 0x7F;
}

/// Removes a parameter's value, a token or a quoted string, from the beginning of `rest`. @return the value.
std::string TakeValue(std::string_view &rest) {
  std::string value;
  if (rest.empty() || rest.front() != '"') {
    const std::size_t end = std::min(rest.find(';'), rest.size());
    value = std::string(TrimBlanks(rest.substr(0, end)));
    rest.remove_prefix(end);
    return value;
  }
  std::size_t at = 1;
  for (; at < rest.size() && rest[at] != '"'; ++at) {
    if (rest[at] == '\\' && at + 1 < rest.size()) {
      ++at; // the character after it is literal
    }
    value.push_back(rest[at]);
  }
  rest.remove_prefix(std::min(rest.find(';', at), rest.size()));
  return value;
}

/// The encoding in the XML declaration at the start of `text`; empty when no encoding is declared.
std::string_view FindDeclaredEncoding(std::string_view text) {
  constexpr std::string_view BEGINNING = "<?xml";
  std::string_view rest = text.substr(0, MAX_DECLARATION_LENGTH);
  const std::size_t close = rest.find("?>");
  if (rest.substr(0, BEGINNING.size()) != BEGINNING || close == std::string_view::npos) {
    return {};
  }
  rest = rest.substr(0, close);
  rest.remove_prefix(BEGINNING.size());
  const auto skipSpace = [&rest] { rest.remove_prefix(std::min(rest.find_first_not_of(XML_SPACE), rest.size())); };
  for (;;) {
    skipSpace();
    const std::string_view name = rest.substr(0, rest.find_first_of(" \t\r\n="));
    rest.remove_prefix(name.size());
    skipSpace();
    if (name.empty() || rest.empty() || rest.front() != '=') {
      return {};
    }
    rest.remove_prefix(1);
    skipSpace();
    const std::size_t end = rest.empty() ? std::string_view::npos : rest.find(rest.front(), 1);
    if (end == std::string_view::npos || (rest.front() != '"' && rest.front() != '\'')) {
      return {};
    }
    if (name == "encoding") {
      return rest.substr(1, end - 1);
    }
    rest.remove_prefix(end + 1);
  }
}

/// ISO-8859-1 has the first 256 characters of Unicode, each as one byte.
void AppendAsUtf8(std::string &out, std::string_view latin1) {
  for (const char c : latin1) {
    const auto byte = static_cast<unsigned char>(c);
    if (IsBeyondAscii(c)) {
      out.push_back(static_cast<char>(0xC0 | byte >> 6));
      out.push_back(static_cast<char>(0x80 | (byte & 0x3F)));
    } else {
      out.push_back(c);
    }
  }
}

} // namespace

std::string FindCharset(std::string_view contentType) {
  std::string_view rest = contentType.substr(std::min(contentType.find(';'), contentType.size()));
  while (!rest.empty()) {
    rest.remove_prefix(1); // the semicolon
    const std::size_t equals = rest.find_first_of("=;");
    if (equals == std::string_view::npos || rest[equals] == ';') {
      rest.remove_prefix(std::min(equals, rest.size()));
      continue;
    }
    const std::string_view name = TrimBlanks(rest.substr(0, equals));
    rest.remove_prefix(equals + 1);
    std::string value = TakeValue(rest);
    if (EqualsIgnoringCase(name, "charset")) {
      return IsToken(value) && value.size() <= MAX_CHARSET_LENGTH ? value : std::string();
    }
  }
  return {};
}

void RecodeToUtf8(std::string &body, std::string_view charset) {
  if (!IsLatin1(charset)) {
    return;
  }
  const auto beyondAscii = std::count_if(body.begin(), body.end(), IsBeyondAscii);
  if (beyondAscii > 0 && Xml::FindInvalidUtf8(body) == std::string_view::npos) {
    return;
  }
  const std::string_view declared = FindDeclaredEncoding(body);
  const bool isDeclared = IsLatin1(declared);
  if (beyondAscii == 0 && !isDeclared) {
    return;
  }
  constexpr std::string_view UTF8 = "UTF-8"; // at most a few bytes longer than the name that it replaces
  std::string recoded;
  recoded.reserve(body.size() + static_cast<std::size_t>(beyondAscii) + UTF8.size());
  const std::string_view whole = body;
  const std::size_t end = isDeclared ? static_cast<std::size_t>(declared.data() - body.data()) : 0;
  AppendAsUtf8(recoded, whole.substr(0, end));
  recoded.append(isDeclared ? UTF8 : "");
  AppendAsUtf8(recoded, whole.substr(end + (isDeclared ? declared.size() : 0)));
  body.swap(recoded);
  SecureWipe(recoded);
}

} // namespace Tarvel::Http
