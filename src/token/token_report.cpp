// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/token_report.h>

#include "token/report_text.h"

#include <tarvel/core/exception.h>

#include <algorithm>

namespace SsoClient {

namespace {

using Check = TokenReport::Check;
using CheckResult = TokenReport::CheckResult;
using Outcome = TokenReport::Outcome;

} // namespace

const CheckResult &TokenReport::Get(Check check) const & {
  const auto found =
      std::find_if(checks.begin(), checks.end(), [check](const CheckResult &one) { return one.check == check; });
  if (found == checks.end()) {
    throw Tarvel::InvalidArgumentException("the report has no check of number " +
                                           std::to_string(static_cast<std::int32_t>(check)));
  }
  return *found;
}

const CheckResult *TokenReport::FirstFailed() const &noexcept {
  const auto failed =
      std::find_if(checks.begin(), checks.end(), [](const CheckResult &one) { return one.outcome == Outcome::FAILED; });
  return failed == checks.end() ? nullptr : &*failed;
}

const char *GetCheckName(Check check) noexcept {
  switch (check) {
  case Check::WELL_FORMED:
    return "well-formed";
  case Check::FORM:
    return "form";
  case Check::IDENTIFIERS:
    return "identifiers";
  case Check::VALIDITY:
    return "validity";
  case Check::CONFIRMATION:
    return "confirmation";
  case Check::DELEGATION:
    return "delegation";
  case Check::ALGORITHMS:
    return "algorithms";
  case Check::KEYS:
    return "keys";
  case Check::REFERENCES:
    return "references";
  case Check::SIGNATURE:
    return "signature";
  case Check::DIGESTS:
    return "digests";
  case Check::NAMES:
    return "names";
  case Check::AUDIENCE:
    return "audience";
  case Check::REQUIRED_CONFIRMATION:
    return "required-confirmation";
  }
  return "unknown";
}

const char *GetOutcomeName(Outcome outcome) noexcept {
  switch (outcome) {
  case Outcome::PASSED:
    return "passed";
  case Outcome::FAILED:
    return "failed";
  case Outcome::NOT_DONE:
    return "not done";
  }
  return "unknown";
}

std::string WriteTokenReport(const TokenReport &report) {
  return WriteChecks("The token", report);
}

} // namespace SsoClient
