// SPDX-License-Identifier: Apache-2.0

#include "xml/date_time_text.h"

#include <cstdint>

namespace SsoClient {

namespace {

using Tarvel::System::DateTime;

constexpr std::uint32_t MICROSECONDS_PER_MINUTE = 60'000'000;

void AppendPadded(std::string &text, int number, std::size_t width) {
  const std::string digits = std::to_string(number);
  if (digits.size() < width) {
    text.append(width - digits.size(), '0');
  }
  text += digits;
}

} // namespace

DateTime AddMinutesToDate(const DateTime &date, int minutes) {
  // The product has 32 bits on purpose and wraps above 35 minutes. It is unsigned because signed numbers must not wrap.
  const std::uint32_t product = static_cast<std::uint32_t>(minutes) * MICROSECONDS_PER_MINUTE;
  const std::int64_t offset = static_cast<std::int32_t>(product);
  return Tarvel::System::DateTimeFromUtc(date.GetUtcTime() + offset, false);
}

std::string DateTimeFormatter(const DateTime &date) {
  std::string text;
  AppendPadded(text, date.GetCentury() * 100 + date.GetYear(), 4);
  text += '-';
  AppendPadded(text, date.GetMonth(), 2);
  text += '-';
  AppendPadded(text, date.GetDay(), 2);
  text += 'T';
  AppendPadded(text, date.GetHour(), 2);
  text += ':';
  AppendPadded(text, date.GetMinute(), 2);
  text += ':';
  AppendPadded(text, date.GetSecond(), 2);
  text += '.';
  AppendPadded(text, date.GetMillisecond(), 3);
  return text + date.ToShortStringBias();
}

} // namespace SsoClient
