// SPDX-License-Identifier: Apache-2.0

#include "report_view.h"

#include <utility>

namespace SsoClient::Tool {
namespace {

bool IsAboutTrust(TokenReport::Check check) noexcept {
  return check == TokenReport::Check::KEYS || check == TokenReport::Check::SIGNATURE;
}

} // namespace

ReportView WithoutTrust(TokenReport report) {
  const TokenReport::CheckResult *const first = report.FirstFailed();
  const bool isRefusalKept = first && !IsAboutTrust(first->check);
  for (TokenReport::CheckResult &result : report.checks) {
    if (IsAboutTrust(result.check)) {
      result.outcome = TokenReport::Outcome::NOT_DONE;
      result.summary = "Not checked, because no trusted certificate was given.";
      result.findings.clear();
      result.unlistedFindings = 0;
    }
  }
  report.accepted = false;
  if (!isRefusalKept) {
    const TokenReport::CheckResult *const failed = report.FirstFailed();
    report.refusal = failed && !failed->findings.empty() ? failed->findings.front().message : "";
  }
  return {std::move(report), false};
}

} // namespace SsoClient::Tool
