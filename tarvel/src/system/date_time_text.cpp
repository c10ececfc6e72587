// SPDX-License-Identifier: Apache-2.0

#include "system/date_time_text.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <algorithm>
#include <string>

namespace Tarvel::System {

namespace {

constexpr int MAX_BIAS_HOURS = 14;

constexpr bool IsDigit(char c) noexcept {
  return c >= '0' && c <= '9';
}

struct Fraction {
  int microseconds;
  bool isZero; ///< whether every digit is 0, including those finer than a microsecond
};

/// Reads the text from left to right, and keeps the first refusal.
class Scanner {
public:
  explicit Scanner(std::string_view text) noexcept : m_text(text) {}

  bool AtEnd() const noexcept { return m_position == m_text.size(); }

  /// Steps over `c` if it is next.
  bool Skip(char c) noexcept {
    if (AtEnd() || m_text[m_position] != c) {
      return false;
    }
    ++m_position;
    return true;
  }

  void Require(char c) noexcept {
    if (!Skip(c)) {
      RefuseForm();
    }
  }

  /// Reads a number of exactly `digits` digits. `refusal` is the reason if it is not from `minimum` to `maximum`.
  int Number(int digits, int minimum, int maximum, const char *refusal) noexcept {
    int value = 0;
    for (int i = 0; i < digits; ++i) {
      value = value * 10 + Digit();
    }
    if (value < minimum || value > maximum) {
      Refuse({refusal});
    }
    return value;
  }

  /// Reads the digits after the point: at least one.
  Fraction FractionDigits() noexcept {
    int microseconds = 0;
    bool isZero = true;
    int scale = 100'000;
    do {
      const int digit = Digit();
      isZero = isZero && digit == 0;
      microseconds += digit * scale;
      scale /= 10;
    } while (!AtEnd() && IsDigit(m_text[m_position]));
    return {microseconds, isZero};
  }

  /// Reads the zone after the time: "Z", an offset, or nothing. @return minutes east of UTC.
  int Zone() noexcept {
    if (AtEnd() || Skip('Z')) {
      return 0;
    }
    const bool east = Skip('+');
    if (!east) {
      Require('-');
    }
    const int hours = Number(2, 0, MAX_BIAS_HOURS, ZONE);
    Require(':');
    const int minutes = Number(2, 0, hours == MAX_BIAS_HOURS ? 0 : 59, ZONE);
    return (hours * 60 + minutes) * (east ? 1 : -1);
  }

  void RequireEnd() noexcept {
    if (!AtEnd()) {
      RefuseForm();
    }
  }

  void Refuse(const DateTimeRefusal &refusal) noexcept {
    if (!m_refusal) {
      m_refusal = refusal;
    }
  }

  const DateTimeRefusal &GetRefusal() const noexcept { return m_refusal; }

private:
  static constexpr const char *ZONE = "zone out of range";

  int Digit() noexcept {
    if (AtEnd() || !IsDigit(m_text[m_position])) {
      RefuseForm();
      return 0;
    }
    return m_text[m_position++] - '0';
  }

  void RefuseForm() noexcept {
    Refuse(AtEnd() ? DateTimeRefusal{"cut short"} : DateTimeRefusal{"malformed at character ", m_position + 1});
  }

  std::string_view m_text;
  std::size_t m_position = 0;
  DateTimeRefusal m_refusal;
};

} // namespace

DateTimeRefusal ReadDateTimeText(std::string_view text, DateTimeFields &fields) noexcept {
  Scanner scanner(text);
  fields.year = scanner.Number(4, 1, 9999, "year out of range");
  scanner.Require('-');
  fields.month = static_cast<unsigned>(scanner.Number(2, 1, 12, "month out of range"));
  scanner.Require('-');
  fields.day = static_cast<unsigned>(scanner.Number(2, 1, 31, "day out of range"));
  scanner.Require('T');
  fields.hour = scanner.Number(2, 0, 24, "hour out of range");
  scanner.Require(':');
  fields.minute = scanner.Number(2, 0, 59, "minute out of range");
  scanner.Require(':');
  fields.second = scanner.Number(2, 0, 59, "second out of range");
  const Fraction fraction = scanner.Skip('.') ? scanner.FractionDigits() : Fraction{0, true};
  fields.microsecond = fraction.microseconds;
  fields.biasMinutes = scanner.Zone();
  scanner.RequireEnd();
  if (fields.hour == 24 && (fields.minute != 0 || fields.second != 0 || !fraction.isZero)) {
    scanner.Refuse({"hour out of range"});
  }
  return scanner.GetRefusal();
}

void RefuseDateTimeText(std::string_view text, const DateTimeRefusal &refusal) {
  std::string message = "\"" + StringUtil::Shorten(text) + "\" is not a date-time: ";
  // A message is read as a C string: a NUL would end it before its reason.
  std::replace(message.begin(), message.end(), '\0', '?');
  message += refusal.reason;
  throw DateTimeFormatException(refusal.character ? message + std::to_string(refusal.character) : message);
}

} // namespace Tarvel::System
