// SPDX-License-Identifier: Apache-2.0

#include "http/cookie_date.h"

#include "http/header_syntax.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <cstddef>

namespace Tarvel::Http {

namespace {

constexpr int FIRST_YEAR = 1601; // RFC 6265, section 5.1.1, step 5

struct DateFields {
  std::optional<int> year, month, day, hour, minute, second;
};

bool IsDigit(char c) noexcept {
  return c >= '0' && c <= '9';
}

bool IsDelimiter(char c) noexcept {
  const auto byte = static_cast<unsigned char>(c);
  return byte == 0x09 || (byte >= 0x20 && byte <= 0x2F) || (byte >= 0x3B && byte <= 0x40) ||
         (byte >= 0x5B && byte <= 0x60) || (byte >= 0x7B && byte <= 0x7E);
}

/// The number that `text` begins with, if it has `minimum` to `maximum` digits; it is removed from `text`.
std::optional<int> TakeNumber(std::string_view &text, std::size_t minimum, std::size_t maximum) {
  const auto end = std::find_if_not(text.begin(), text.end(), IsDigit);
  const auto length = static_cast<std::size_t>(end - text.begin());
  if (length < minimum || length > maximum) {
    return std::nullopt;
  }
  int number = 0;
  for (const char digit : text.substr(0, length)) {
    number = number * 10 + (digit - '0');
  }
  text.remove_prefix(length);
  return number;
}

/// hh:mm:ss, with one or two digits each. Anything that does not begin with a digit may follow.
bool TakeTime(std::string_view token, DateFields &fields) {
  const auto hour = TakeNumber(token, 1, 2);
  if (!hour || token.empty() || token.front() != ':') {
    return false;
  }
  token.remove_prefix(1);
  const auto minute = TakeNumber(token, 1, 2);
  if (!minute || token.empty() || token.front() != ':') {
    return false;
  }
  token.remove_prefix(1);
  const auto second = TakeNumber(token, 1, 2);
  if (!second) {
    return false;
  }
  fields.hour = hour;
  fields.minute = minute;
  fields.second = second;
  return true;
}

std::optional<int> FindMonth(std::string_view token) {
  constexpr std::array<std::string_view, 12> NAMES{"jan", "feb", "mar", "apr", "may", "jun",
                                                   "jul", "aug", "sep", "oct", "nov", "dec"};
  const std::string_view start = token.substr(0, 3);
  const auto found = std::find_if(NAMES.begin(), NAMES.end(),
                                  [start](std::string_view name) { return EqualsIgnoringCase(name, start); });
  return found == NAMES.end() ? std::nullopt : std::optional<int>(static_cast<int>(found - NAMES.begin()) + 1);
}

/// Assigns `token` to the first field that has no value yet and that it matches, in the order of the standard.
void TakeToken(std::string_view token, DateFields &fields) {
  if (!fields.hour && TakeTime(token, fields)) {
    return;
  }
  if (!fields.day) {
    std::string_view rest = token;
    if ((fields.day = TakeNumber(rest, 1, 2))) {
      return;
    }
  }
  if (!fields.month && (fields.month = FindMonth(token))) {
    return;
  }
  if (!fields.year) {
    fields.year = TakeNumber(token, 2, 4);
  }
}

int ExpandYear(int year) noexcept {
  if (year >= 70 && year <= 99) {
    return year + 1900;
  }
  return year <= 69 ? year + 2000 : year;
}

std::optional<std::int64_t> ToMicroseconds(const DateFields &fields) {
  if (!fields.year || !fields.month || !fields.day || !fields.hour) {
    return std::nullopt;
  }
  const int year = ExpandYear(*fields.year);
  const std::chrono::year_month_day date(std::chrono::year(year),
                                         std::chrono::month(static_cast<unsigned>(*fields.month)),
                                         std::chrono::day(static_cast<unsigned>(*fields.day)));
  if (year < FIRST_YEAR || !date.ok() || *fields.hour > 23 || *fields.minute > 59 || *fields.second > 59) {
    return std::nullopt;
  }
  const std::chrono::microseconds sinceEpoch = std::chrono::sys_days(date).time_since_epoch() +
                                               std::chrono::hours(*fields.hour) + std::chrono::minutes(*fields.minute) +
                                               std::chrono::seconds(*fields.second);
  return sinceEpoch.count();
}

} // namespace

std::optional<std::int64_t> ParseCookieDate(std::string_view text) {
  DateFields fields;
  for (auto position = text.begin(); position != text.end();) {
    const auto start = std::find_if_not(position, text.end(), IsDelimiter);
    position = std::find_if(start, text.end(), IsDelimiter);
    if (start != position) {
      TakeToken(text.substr(static_cast<std::size_t>(start - text.begin()), static_cast<std::size_t>(position - start)),
                fields);
    }
  }
  return ToMicroseconds(fields);
}

} // namespace Tarvel::Http
