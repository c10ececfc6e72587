// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/token_report.h>

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <algorithm>

namespace SsoClient {

namespace {

using Check = TokenReport::Check;
using CheckResult = TokenReport::CheckResult;
using Finding = TokenReport::Finding;
using Outcome = TokenReport::Outcome;

void AppendColumn(std::string &text, const std::string &word, std::size_t width) {
  text += word;
  text.append(width > word.size() ? width - word.size() : 0, ' ');
  text += "  ";
}

void AppendPart(std::string &text, const char *name, const std::string &value) {
  if (!value.empty()) {
    text.append("\n      ").append(name).append(": ").append(value);
  }
}

std::string PlaceOf(const Finding &finding) {
  std::string place = finding.path;
  if (!finding.attribute.empty()) {
    place.append("/@").append(finding.attribute);
  }
  if (finding.line != 0) {
    place += place.empty() ? "" : ", ";
    place += "line " + std::to_string(finding.line) + ", column " + std::to_string(finding.column);
  }
  return place;
}

void AppendFinding(std::string &text, const Finding &finding) {
  text.append("    ").append(finding.message);
  AppendPart(text, "at", PlaceOf(finding));
  AppendPart(text, "wanted", finding.wanted);
  AppendPart(text, "found", finding.found);
  AppendPart(text, "missed by", finding.missedBySec ? std::to_string(finding.missedBySec) + " s" : std::string());
  AppendPart(text, "what to do", finding.remedy);
  text += "\n";
}

void AppendCheck(std::string &text, const CheckResult &result) {
  constexpr std::size_t CHECK_WIDTH = 21; // of "required-confirmation"
  constexpr std::size_t OUTCOME_WIDTH = 8;
  AppendColumn(text, GetCheckName(result.check), CHECK_WIDTH);
  AppendColumn(text, GetOutcomeName(result.outcome), OUTCOME_WIDTH);
  text.append(result.summary).append("\n");
  for (const Finding &finding : result.findings) {
    AppendFinding(text, finding);
  }
  if (result.unlistedFindings != 0) {
    text.append("    and ").append(std::to_string(result.unlistedFindings)).append(" more\n");
  }
}

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
  using Tarvel::StringUtil;
  std::string text = report.accepted
                         ? "The token is accepted.\n"
                         : "The token is refused: " + StringUtil::Shorten(StringUtil::Printable(report.refusal)) + "\n";
  for (const CheckResult &result : report.checks) {
    AppendCheck(text, result);
  }
  return text;
}

} // namespace SsoClient
