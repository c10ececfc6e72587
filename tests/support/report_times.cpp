// SPDX-License-Identifier: Apache-2.0

#include "support/report_times.h"

#include <tarvel/system/date_time.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>

namespace Testing {

using namespace SsoClient;
using Check = TokenReport::Check;
using Outcome = TokenReport::Outcome;

namespace {

constexpr std::int64_t SECOND = 1'000'000;

bool BeginsWith(const std::string &text, const std::string &beginning) {
  return text.compare(0, beginning.size(), beginning) == 0;
}

/// By how many microseconds the clock is too early or too late; negative if it is not.
struct Misses {
  std::int64_t start = 0;
  std::int64_t end = 0;
};

/// In the profile SAML2, the dates of conditions, confirmations and sessions are checked. Each message states its date.
std::string JudgeSaml2Finding(const TokenReport::Finding &finding, std::int64_t now, std::int64_t tolerance) {
  for (const char *const beginning :
       {"Token start date is in the future: ", "The subject confirmation cannot be used before: ",
        "The token has expired at: ", "The subject confirmation has expired at: ", "The session has ended at: "}) {
    if (BeginsWith(finding.message, beginning)) {
      Tarvel::System::DateTime date;
      if (!Tarvel::System::DateTime::TryParse(finding.message.substr(std::strlen(beginning)), date)) {
        return "a message ends with no time: " + finding.message + '\n';
      }
      const bool isStart =
          BeginsWith(finding.message, "Token start") || BeginsWith(finding.message, "The subject confirmation cannot");
      const std::int64_t missed = (isStart ? date.GetUtcTime() - now : now - date.GetUtcTime()) - tolerance;
      return std::abs(finding.missedBySec * SECOND - missed) <= SECOND
                 ? ""
                 : "a time is missed by " + std::to_string(missed / SECOND) + " s: " + finding.message + '\n';
    }
  }
  return finding.missedBySec == 0 ? "" : "a time is missed by \"" + finding.message + "\"\n";
}

std::string FindWrongSaml2Times(const TokenReport &report, const Misses &misses, std::int64_t now,
                                std::int64_t tolerance) {
  std::string wrong;
  if (report.accepted && (misses.start > 0 || misses.end >= 0)) {
    wrong += "it is accepted at an invalid time\n";
  }
  for (const TokenReport::CheckResult &result : report.checks) {
    for (const TokenReport::Finding &finding : result.findings) {
      wrong += JudgeSaml2Finding(finding, now, tolerance);
    }
  }
  return wrong;
}

std::string JudgeFinding(const TokenReport::Finding &finding, const Misses &misses) {
  const bool isStart = BeginsWith(finding.message, "Token start date is in the future: ");
  const bool isEnd = BeginsWith(finding.message, "The token has expired at: ");
  if (!isStart && !isEnd) {
    return finding.missedBySec == 0 ? "" : "a time is missed by \"" + finding.message + "\"\n";
  }
  const std::int64_t missed = isStart ? misses.start : misses.end;
  if (std::abs(finding.missedBySec * SECOND - missed) <= SECOND) {
    return "";
  }
  return std::string("the clock misses the ") + (isStart ? "start" : "end") + " by " + std::to_string(missed / SECOND) +
         " s, not by " + std::to_string(finding.missedBySec) + '\n';
}

} // namespace

std::string FindWrongTimes(const TokenReport &report, const VerifyOptions &options) {
  std::string wrong;
  const std::int64_t now = Tarvel::System::GetUtcDateTime().GetUtcTime();
  if (report.checkedAt.GetUtcTime() != now) {
    wrong += "the report has another time: " + report.checkedAt.ToString() + '\n';
  }
  const TokenReport::CheckResult &validity = report.Get(Check::VALIDITY);
  if (report.Get(Check::FORM).outcome != Outcome::PASSED) {
    return wrong;
  }
  if (!report.claims.startDate || !report.claims.endDate) {
    return wrong + "the form is right, but there are no dates\n";
  }
  const std::int64_t start = report.claims.startDate->GetUtcTime();
  const std::int64_t end = report.claims.endDate->GetUtcTime();
  const std::int64_t tolerance = options.clockToleranceSec * SECOND;
  const Misses misses{start - now - tolerance, now - end - tolerance};
  if (options.profile == TokenProfile::SAML2) {
    return wrong + FindWrongSaml2Times(report, misses, now, tolerance);
  }
  const bool isValid = start < end && misses.start <= 0 && misses.end < 0;
  if (isValid != (validity.outcome == Outcome::PASSED)) {
    wrong += isValid ? "VALIDITY fails for a valid time\n" : "VALIDITY passes for an invalid time\n";
  }
  for (const TokenReport::Finding &finding : validity.findings) {
    wrong += JudgeFinding(finding, misses);
  }
  return wrong;
}

} // namespace Testing
