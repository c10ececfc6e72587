// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the tool writes to standard error when it refuses something.

#pragma once

#include <string>

namespace ToolTest {

/// The hint after the refusal of a token that the caller gave.
constexpr const char *EXPLAIN_HINT = "ssoclient verify --explain shows each check of the token, and what to do";

/// The hint after the refusal of a token that the service issued.
constexpr const char *SAVE_HINT =
    "--save-refused FILE keeps the refused token; ssoclient verify --explain then shows each check of it";

/// Whether a failure of this class refuses a token, if it occurs while the tool verifies one.
inline bool IsAboutToken(const std::string &exceptionClass) {
  return exceptionClass == "ParseException" || exceptionClass == "XMLParseException" ||
         exceptionClass == "InvalidSignatureException";
}

/// @param hint empty: there is no hint
inline std::string RefusalText(const std::string &label, const std::string &message, const std::string &hint) {
  return "ssoclient: " + label + ": " + message + "\n" + (hint.empty() ? "" : "ssoclient: hint: " + hint + "\n");
}

/// The same in JSON. Nothing in the arguments may need an escape.
inline std::string RefusalJson(const std::string &exceptionClass, const std::string &message, const std::string &hint) {
  return R"({"schema":1,"error":{"class":")" + exceptionClass + R"(","message":")" + message + "\"" +
         (hint.empty() ? "" : R"(,"hint":")" + hint + "\"") + "}}\n";
}

} // namespace ToolTest
