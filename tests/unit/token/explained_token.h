// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reports on tokens, and their outcomes as one text.

#pragma once

#include "unit/token/assertion_text.h"
#include "unit/token/signed_assertion.h"

#include <ssoclient/token_verifier.h>
#include <tarvel/core/environment.h>

#include <gtest/gtest.h>

#include <string>

namespace Testing {

/// In all tests of this fixture the time is 2026-01-02T03:04:05Z.
class ExplainedTokenTest : public ::testing::Test {
protected:
  static SsoClient::TokenReport Explain(const std::string &xml, const SsoClient::VerifyOptions &options = {}) {
    return SsoClient::TokenVerifier(TokenCertificates(), options).Explain(xml);
  }

private:
  Tarvel::ScopedEnvironment m_clock{{[] { return Tarvel::System::DateTime("2026-01-02T03:04:05Z").GetUtcTime(); }, {}}};
};

/// The names of the checks that did not pass, such as "validity failed, names not done".
inline std::string NotPassed(const SsoClient::TokenReport &report) {
  std::string text;
  for (const auto &result : report.checks) {
    if (result.outcome != SsoClient::TokenReport::Outcome::PASSED) {
      text.append(text.empty() ? "" : ", ").append(GetCheckName(result.check)).append(" ");
      text.append(GetOutcomeName(result.outcome));
    }
  }
  return text;
}

/// The only finding of `check`. If there is none or more than one, the test fails, and the result is empty.
inline SsoClient::TokenReport::Finding OnlyFinding(const SsoClient::TokenReport &report,
                                                   SsoClient::TokenReport::Check check) {
  const auto &findings = report.Get(check).findings;
  EXPECT_EQ(1u, findings.size()) << WriteTokenReport(report);
  return findings.size() == 1 ? findings.front() : SsoClient::TokenReport::Finding();
}

} // namespace Testing
