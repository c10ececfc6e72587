// SPDX-License-Identifier: Apache-2.0

#include "time_text.h"

#include <array>
#include <charconv>
#include <cstdio>

namespace DevSts {

namespace {

using namespace std::chrono;

constexpr std::string_view FORM = "0000-00-00T00:00:00"; // 0 means any digit

bool HasForm(std::string_view text) {
  for (std::size_t i = 0; i < FORM.size(); ++i) {
    const bool isDigit = text[i] >= '0' && text[i] <= '9';
    if (FORM[i] == '0' ? !isDigit : text[i] != FORM[i]) {
      return false;
    }
  }
  return true;
}

unsigned Number(std::string_view digits) {
  unsigned number = 0;
  std::from_chars(digits.data(), digits.data() + digits.size(), number);
  return number;
}

/// The milliseconds of ".123456" or of an empty text.
std::optional<milliseconds> Fraction(std::string_view text) {
  if (text.empty()) {
    return milliseconds(0);
  }
  const std::string_view digits = text.substr(1);
  if (text[0] != '.' || digits.empty() || digits.find_first_not_of("0123456789") != std::string_view::npos) {
    return std::nullopt;
  }
  return milliseconds(Number((std::string(digits.substr(0, 3)) + "00").substr(0, 3)));
}

} // namespace

Time Now() {
  return floor<milliseconds>(system_clock::now());
}

std::string TimeText(Time time) {
  const auto day = floor<days>(time);
  const year_month_day date(day);
  const hh_mm_ss<milliseconds> clock(time - day);
  std::array<char, 64> text{};
  std::snprintf(text.data(), text.size(), "%04d-%02u-%02uT%02d:%02d:%02d.%03dZ", static_cast<int>(date.year()),
                static_cast<unsigned>(date.month()), static_cast<unsigned>(date.day()),
                static_cast<int>(clock.hours().count()), static_cast<int>(clock.minutes().count()),
                static_cast<int>(clock.seconds().count()), static_cast<int>(clock.subseconds().count()));
  return text.data();
}

std::string HttpTimeText(Time time) {
  constexpr std::array<const char *, 7> DAYS{"Sun", "Mon", "Tue", "Wed", "Thu", "Fri", "Sat"};
  constexpr std::array<const char *, 12> MONTHS{"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                                "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
  const auto day = floor<days>(time);
  const year_month_day date(day);
  const hh_mm_ss<milliseconds> clock(time - day);
  std::array<char, 64> text{};
  std::snprintf(text.data(), text.size(), "%s, %02u %s %04d %02d:%02d:%02d GMT", DAYS[weekday(day).c_encoding()],
                static_cast<unsigned>(date.day()), MONTHS[static_cast<unsigned>(date.month()) - 1],
                static_cast<int>(date.year()), static_cast<int>(clock.hours().count()),
                static_cast<int>(clock.minutes().count()), static_cast<int>(clock.seconds().count()));
  return text.data();
}

std::optional<Time> ParseTime(std::string_view text) {
  if (text.size() <= FORM.size() || text.back() != 'Z' || !HasForm(text)) {
    return std::nullopt;
  }
  const auto fraction = Fraction(text.substr(FORM.size(), text.size() - FORM.size() - 1));
  const year_month_day date{year(static_cast<int>(Number(text.substr(0, 4)))), month(Number(text.substr(5, 2))),
                            day(Number(text.substr(8, 2)))};
  const hours hour(Number(text.substr(11, 2)));
  const minutes minute(Number(text.substr(14, 2)));
  const seconds second(Number(text.substr(17, 2)));
  if (!fraction || !date.ok() || hour > hours(23) || minute > minutes(59) || second > seconds(59)) {
    return std::nullopt;
  }
  return sys_days(date) + hour + minute + second + *fraction;
}

} // namespace DevSts
