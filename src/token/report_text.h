// SPDX-License-Identifier: Apache-2.0
/// @file
/// The texts of reports.

#pragma once

#include <ssoclient/token_report.h>
#include <tarvel/core/string_util.h>

#include <string>

namespace SsoClient {

/// Appends the line of a check.
void AppendCheckLine(std::string &text, const char *check, TokenReport::Outcome outcome, const std::string &summary);

/// Appends the lines of a finding.
void AppendFinding(std::string &text, const TokenReport::Finding &finding);

/// The verdict on `subject`, such as "The token", and all checks of a report with their findings.
template <typename Report>
std::string WriteChecks(const std::string &subject, const Report &report) {
  using Tarvel::StringUtil;
  std::string text =
      subject + (report.accepted ? " is accepted.\n"
                                 : " is refused: " + StringUtil::Shorten(StringUtil::Printable(report.refusal)) + "\n");
  for (const auto &result : report.checks) {
    AppendCheckLine(text, GetCheckName(result.check), result.outcome, result.summary);
    for (const TokenReport::Finding &finding : result.findings) {
      AppendFinding(text, finding);
    }
    if (result.unlistedFindings != 0) {
      text.append("    and ").append(std::to_string(result.unlistedFindings)).append(" more\n");
    }
  }
  return text;
}

} // namespace SsoClient
