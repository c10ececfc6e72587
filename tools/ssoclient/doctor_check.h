// SPDX-License-Identifier: Apache-2.0
/// @file
/// `DoctorCheck`, one check of `ssoclient doctor`, and how the checks are shown.

#pragma once

#include "exit_code.h"
#include "terminal_style.h"

#include <tarvel/system/date_time.h>

#include <nlohmann/json.hpp>

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient::Tool {

enum class CheckOutcome { FINE, WARNING, FAILED, NOT_DONE };

/// What one check has found, in sentences. All texts are printable.
struct DoctorCheck {
  explicit DoctorCheck(std::string checkName) : name(std::move(checkName)) {}

  std::string name;
  CheckOutcome outcome = CheckOutcome::FINE;
  ExitCode exitCode = ExitCode::DONE; ///< of the tool, if this is the first check that failed
  std::vector<std::string> found;     ///< at least one
  std::vector<std::string> details;   ///< shown in text only, since `facts` contains the same
  std::vector<std::string> todo;      ///< may be empty
  nlohmann::ordered_json facts = nlohmann::ordered_json::object(); ///< further keys of the JSON form

  /// Makes the check one that was not done, for this reason.
  void Skip(const std::string &reason);
  /// Adds a warning. @param advice what to do about it
  void Warn(const std::string &advice);
  /// Makes the check one that failed. @param code counts only for the first failure. @param advice as above
  void Fail(ExitCode code, const std::string &advice);
};

/// A text that others wrote, for people: cut at 200 octets, then made printable.
std::string Shown(std::string_view text);

/// `Shown(text)` with a capital letter at the beginning and a full stop at the end.
std::string Sentence(std::string_view text);

/// "1 day" or "3 days"; the same for any other unit.
std::string Count(std::int64_t number, const std::string &unit);

/// A duration for people: "(12 ms)".
std::string DurationText(std::int64_t microseconds);

std::int64_t Milliseconds(std::int64_t microseconds);

/// The texts with `separator` between them.
std::string JoinTexts(const std::vector<std::string> &texts, std::string_view separator = ", ");

/// The exit code of the first check that failed; DONE if none did.
ExitCode ExitCodeOf(const std::vector<DoctorCheck> &checks);

/// The checks as lines of text, for people.
std::string RenderChecks(const std::vector<DoctorCheck> &checks, const TextStyle &style);

/// The checks as one JSON object.
std::string RenderChecksJson(const std::vector<DoctorCheck> &checks);

} // namespace SsoClient::Tool
