// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MessageFormatter`, which puts arguments into the placeholders %1 to %9 of a message.

#pragma once

#include <tarvel/core/export.h>

#include <string>
#include <string_view>
#include <type_traits>

namespace Tarvel {

/// One argument of a message, as text. To make a type usable as an argument, define an overload of
/// `FormatMessageArgument` that returns `std::string`, in the type's own namespace, where argument-dependent look-up
/// finds it. Texts, numbers, Booleans ("true", "false") and pointers (hexadecimal, "(null)" when null) have an overload
/// already.
namespace MessageArguments {

/// The text of an argument of a message.
TARVEL_API std::string FormatMessageArgument(bool value);
TARVEL_API std::string FormatMessageArgument(char value);
TARVEL_API std::string FormatMessageArgument(long long value);
TARVEL_API std::string FormatMessageArgument(unsigned long long value);
TARVEL_API std::string FormatMessageArgument(double value);
TARVEL_API std::string FormatMessageArgument(const char *value);
TARVEL_API std::string FormatMessageArgument(const void *value);
TARVEL_API std::string FormatMessageArgument(std::string_view value);

/// The text of an argument of any type that has a `FormatMessageArgument`.
template <typename T>
std::string ToText(const T &value) {
  if constexpr (std::is_same_v<T, bool> || std::is_same_v<T, char>) {
    return FormatMessageArgument(value);
  } else if constexpr (std::is_enum_v<T>) {
    return FormatMessageArgument(static_cast<long long>(value));
  } else if constexpr (std::is_integral_v<T> && std::is_unsigned_v<T>) {
    return FormatMessageArgument(static_cast<unsigned long long>(value));
  } else if constexpr (std::is_integral_v<T>) {
    return FormatMessageArgument(static_cast<long long>(value));
  } else if constexpr (std::is_floating_point_v<T>) {
    return FormatMessageArgument(static_cast<double>(value));
  } else if constexpr (std::is_convertible_v<const T &, const char *>) {
    return FormatMessageArgument(static_cast<const char *>(value));
  } else if constexpr (std::is_convertible_v<const T &, std::string_view>) {
    return FormatMessageArgument(std::string_view(value));
  } else {
    return FormatMessageArgument(value);
  }
}

} // namespace MessageArguments

/// Message formatting with positional placeholders.
class TARVEL_API MessageFormatter {
public:
  MessageFormatter() = delete;

  /// `format` with %1 to %9 replaced by the arguments in order. A placeholder without an argument stays as it is, "%%"
  /// is one per cent sign, and placeholders within an argument are not replaced.
  template <typename... Args>
  static std::string ASPrint(std::string_view format, const Args &...args) {
    static_assert(sizeof...(Args) <= 9, "a message has the placeholders %1 to %9");
    const std::string texts[sizeof...(Args) + 1] = {MessageArguments::ToText(args)..., std::string()};
    return Substitute(format, texts, sizeof...(Args));
  }

private:
  static std::string Substitute(std::string_view format, const std::string *texts, std::size_t count);
};

} // namespace Tarvel
