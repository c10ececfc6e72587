// SPDX-License-Identifier: Apache-2.0

#include "http/set_cookie.h"

#include "http/cookie_date.h"
#include "http/header_syntax.h"

#include <algorithm>
#include <limits>
#include <utility>

namespace Tarvel::Http {

namespace {

/// Name and value of "name=value", without the blanks around them; the value is empty when there is no "=".
std::pair<std::string_view, std::string_view> Split(std::string_view pair) {
  const std::size_t equals = pair.find('=');
  if (equals == std::string_view::npos) {
    return {TrimBlanks(pair), {}};
  }
  return {TrimBlanks(pair.substr(0, equals)), TrimBlanks(pair.substr(equals + 1))};
}

/// Removes the text before the next semicolon, and that semicolon; returns the text.
std::string_view TakePiece(std::string_view &rest) {
  const std::size_t end = std::min(rest.find(';'), rest.size());
  const std::string_view piece = rest.substr(0, end);
  rest.remove_prefix(std::min(end + 1, rest.size()));
  return piece;
}

/// A number of seconds, clamped to a limit; nullopt when `text` is not a number.
std::optional<std::int64_t> ParseMaxAge(std::string_view text) {
  const bool isNegative = !text.empty() && text.front() == '-';
  const std::string_view digits = text.substr(isNegative ? 1 : 0);
  if (digits.empty() || !std::all_of(digits.begin(), digits.end(), [](char c) { return c >= '0' && c <= '9'; })) {
    return std::nullopt;
  }
  constexpr std::int64_t LIMIT = std::numeric_limits<std::int32_t>::max(); // 68 years, longer than any process runs
  std::int64_t seconds = 0;
  for (const char digit : digits) {
    seconds = std::min(seconds * 10 + (digit - '0'), LIMIT);
  }
  return isNegative ? -seconds : seconds;
}

void TakeAttribute(std::string_view name, std::string_view value, SetCookie &cookie) {
  if (EqualsIgnoringCase(name, "Expires")) {
    if (const auto date = ParseCookieDate(value)) {
      cookie.expires = date;
    }
  } else if (EqualsIgnoringCase(name, "Max-Age")) {
    if (const auto seconds = ParseMaxAge(value)) {
      cookie.maxAge = seconds;
    }
  } else if (EqualsIgnoringCase(name, "Domain")) {
    if (!value.empty()) {
      cookie.domain = std::string(value.substr(value.front() == '.' ? 1 : 0));
    }
  } else if (EqualsIgnoringCase(name, "Path")) {
    cookie.path = !value.empty() && value.front() == '/' ? std::string(value) : std::string();
  } else if (EqualsIgnoringCase(name, "Secure")) {
    cookie.isSecure = true;
  }
}

} // namespace

std::optional<SetCookie> ParseSetCookie(std::string_view text) {
  std::string_view rest = text;
  const std::string_view first = TakePiece(rest);
  const auto [name, value] = Split(first);
  // Name and value are sent back in a header, so they must not contain control characters. `Split` has removed tabs
  // around them.
  const bool isClean = IsFieldValue(name) && IsFieldValue(value);
  if (first.find('=') == std::string_view::npos || name.empty() || !isClean) {
    return std::nullopt;
  }
  SetCookie cookie;
  cookie.name = std::string(name);
  cookie.value = std::string(value);
  while (!rest.empty()) {
    const auto [attribute, attributeValue] = Split(TakePiece(rest));
    TakeAttribute(attribute, attributeValue, cookie);
  }
  return cookie;
}

} // namespace Tarvel::Http
