// SPDX-License-Identifier: Apache-2.0

#include "integration/service/wrong_answers.h"

#include <ssoclient/exceptions.h>

#include <algorithm>
#include <cstddef>
#include <exception>
#include <string_view>
#include <typeinfo>

namespace Testing {
namespace {

constexpr std::string_view DIGITS = "0123456789";

/// The name of the class; for a class that no test expects, the compiler's name.
std::string ClassOf(const std::exception &exception) {
  const struct {
    const std::type_info &type;
    const char *name;
  } classes[] = {{typeid(SsoClient::SsoException), "SsoException"},
                 {typeid(SsoClient::InvalidCredentialsException), "InvalidCredentialsException"},
                 {typeid(SsoClient::CommunicationException), "CommunicationException"},
                 {typeid(SsoClient::InvalidSignatureException), "InvalidSignatureException"},
                 {typeid(SsoClient::ParseException), "ParseException"}};
  for (const auto &known : classes) {
    if (known.type == typeid(exception)) {
      return known.name;
    }
  }
  return typeid(exception).name();
}

void ReplaceAll(std::string &message, std::string_view from, std::string_view to) {
  for (std::size_t at = message.find(from); at != std::string::npos; at = message.find(from, at + to.size())) {
    message.replace(at, from.size(), to);
  }
}

/// Replaces each number between `before` and `after` by "#".
void HideNumbers(std::string &message, std::string_view before, std::string_view after) {
  for (std::size_t at = message.find(before); at != std::string::npos; at = message.find(before, at)) {
    at += before.size();
    const std::size_t end = std::min(message.find_first_not_of(DIGITS, at), message.size());
    if (end != at && message.compare(end, after.size(), after) == 0) {
      message.replace(at, end - at, "#");
    }
  }
}

/// Replaces each date and time by "DATE".
void HideDates(std::string &message) {
  constexpr std::string_view FORM = "0000-00-00T00:00:00.000Z";
  const auto fits = [](char form, char c) { return form == '0' ? DIGITS.find(c) != DIGITS.npos : c == form; };
  for (std::size_t at = 0; at + FORM.size() <= message.size(); ++at) {
    if (std::equal(FORM.begin(), FORM.end(), message.begin() + static_cast<std::ptrdiff_t>(at), fits)) {
      message.replace(at, FORM.size(), "DATE");
    }
  }
}

/// The message in the form of `WrongAnswer`.
std::string Reduce(std::string message, int port) {
  ReplaceAll(message, "localhost:" + std::to_string(port), "%e");
  HideNumbers(message, "line ", ", column");
  HideNumbers(message, "column ", "");
  HideNumbers(message, "after ", " of the body's ");
  HideNumbers(message, " of the body's ", " bytes");
  HideDates(message);
  return message;
}

} // namespace

std::string OutcomeOf(const std::function<std::string()> &operation, int port) {
  try {
    return operation();
  } catch (const std::exception &exception) {
    return ClassOf(exception) + ": " + Reduce(exception.what(), port);
  }
}

} // namespace Testing
