// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OutcomeCount`, which counts outcomes, so that a test can show that it has reached those that it is about.

#pragma once

#include "support/judged_token.h"

#include <cstddef>
#include <map>
#include <set>
#include <string>

namespace Reports {

class OutcomeCount {
public:
  void Add(const Testing::Judgement &judgement) {
    ++m_tokens;
    if (judgement.verification.token) {
      ++m_accepted;
      return;
    }
    m_refusals.insert(judgement.verification.refusal);
    if (const SsoClient::TokenReport::CheckResult *const failed = judgement.report.FirstFailed()) {
      ++m_firstFailed[SsoClient::GetCheckName(failed->check)];
    }
  }

  std::size_t GetTokens() const { return m_tokens; }
  std::size_t GetAccepted() const { return m_accepted; }
  std::size_t GetDifferentRefusals() const { return m_refusals.size(); }

  /// How often each check was the first that failed.
  const std::map<std::string, int> &GetFirstFailed() const { return m_firstFailed; }

private:
  std::size_t m_tokens = 0;
  std::size_t m_accepted = 0;
  std::set<std::string> m_refusals;
  std::map<std::string, int> m_firstFailed;
};

} // namespace Reports
