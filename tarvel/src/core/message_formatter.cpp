// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/message_formatter.h>

#include <array>
#include <charconv>
#include <cstddef>
#include <cstdint>

namespace Tarvel {

namespace {

/// Enough for the longest text of a 64-bit integer in base 10 or 16, or of a double in its shortest form.
constexpr std::size_t NUMBER_TEXT_LENGTH = 32;

template <typename T, typename... Base>
std::string NumberText(T value, Base... base) {
  std::array<char, NUMBER_TEXT_LENGTH> text;
  const auto result = std::to_chars(text.data(), text.data() + text.size(), value, base...);
  return std::string(text.data(), result.ptr);
}

} // namespace

namespace MessageArguments {

std::string FormatMessageArgument(bool value) {
  return value ? "true" : "false";
}

std::string FormatMessageArgument(char value) {
  return std::string(1, value);
}

std::string FormatMessageArgument(long long value) {
  return NumberText(value);
}

std::string FormatMessageArgument(unsigned long long value) {
  return NumberText(value);
}

std::string FormatMessageArgument(double value) {
  return NumberText(value);
}

std::string FormatMessageArgument(const char *value) {
  return value ? value : "(null)";
}

std::string FormatMessageArgument(const void *value) {
  return value ? "0x" + NumberText(reinterpret_cast<std::uintptr_t>(value), 16) : "(null)";
}

std::string FormatMessageArgument(std::string_view value) {
  return std::string(value);
}

} // namespace MessageArguments

std::string MessageFormatter::Substitute(std::string_view format, const std::string *texts, std::size_t count) {
  std::string message;
  message.reserve(format.size());
  std::size_t position = 0;
  while (position < format.size()) {
    const std::size_t mark = format.find('%', position);
    message += format.substr(position, mark - position);
    if (mark == std::string_view::npos) {
      break;
    }
    const char next = mark + 1 < format.size() ? format[mark + 1] : '\0';
    if (next >= '1' && next <= '9' && static_cast<std::size_t>(next - '1') < count) {
      message += texts[next - '1'];
      position = mark + 2;
      continue;
    }
    message += '%';
    position = mark + (next == '%' ? 2 : 1);
  }
  return message;
}

} // namespace Tarvel
