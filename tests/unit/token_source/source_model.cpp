// SPDX-License-Identifier: Apache-2.0

#include "unit/token_source/source_model.h"

#include <algorithm>
#include <cmath>
#include <utility>

namespace Testing {

namespace {

const std::string LATE = "DeadlineExceededException: The deadline passed before the operation ended";

} // namespace

void SourceModel::Ask(int call, std::int64_t deadline) {
  if (deadline <= steady) {
    End(call, LATE);
    return;
  }
  m_isAsked = true;
  if (IsUsable()) {
    End(call, m_token.id);
    if (IsDue() && !m_isAttempting && steady >= m_notBefore) {
      StartAttempt();
    }
    return;
  }
  if (!m_isAttempting && !m_failure.empty() && steady < m_notBefore) {
    End(call, m_failure);
    return;
  }
  m_waiting[call] = deadline;
  if (!m_isAttempting) {
    StartAttempt();
  }
}

void SourceModel::Cancel(int call) {
  if (m_waiting.erase(call) != 0) {
    End(call, "CancelledException: The operation was cancelled");
  }
}

void SourceModel::StartAttempt() {
  m_isAttempting = true;
  m_isRenewalForbidden = false;
  ++m_attempts;
  m_attemptEnd = steady + ATTEMPT_TIMEOUT;
  if (m_hasToken && m_token.isRenewable && wall < m_token.end) {
    events.push_back("renew " + m_token.id + " 3600");
    m_requests.push_back({m_attempts, true});
  } else {
    AskProvider();
  }
}

void SourceModel::AskProvider() {
  m_waitsForProvider = true;
  m_isProviderCalled = true;
}

void SourceModel::EndProvider(bool succeeds) {
  m_isProviderCalled = false;
  if (!std::exchange(m_waitsForProvider, false) || !m_isAttempting) {
    return;
  }
  if (succeeds) {
    events.emplace_back("acquire alice");
    m_requests.push_back({m_attempts, false});
  } else {
    EndAttempt(nullptr, "another: the provider failed");
  }
}

void SourceModel::Answer(const Token *token) {
  const Request request = m_requests.front();
  m_requests.pop_front();
  if (!m_isAttempting || request.attempt != m_attempts) {
    return;
  }
  if (request.isRenewal && (!token || m_isRenewalForbidden)) {
    AskProvider();
    return;
  }
  EndAttempt(token, "CommunicationException: down");
}

void SourceModel::EndAttempt(const Token *token, const std::string &failure) {
  m_isAttempting = false;
  m_waitsForProvider = false;
  m_isAsked = false;
  const auto waiting = std::exchange(m_waiting, {});
  std::string outcome = failure;
  if (!token) {
    Fail(failure);
  } else {
    const SourceModel before = *this;
    Accept(*token);
    if (IsInvalidated(token->id)) {
      outcome = "SsoException: invalidated";
    } else if (!IsUsable()) {
      outcome = "SsoException: expired";
    } else {
      outcome = token->id;
    }
    if (outcome != token->id || (before.IsUsable() && token->end <= before.m_token.end)) {
      *this = before;
      Fail(outcome == token->id ? "" : outcome);
    }
  }
  if (IsUsable()) {
    outcome = m_token.id;
  }
  for (const auto &call : waiting) {
    End(call.first, outcome);
  }
}

void SourceModel::Fail(const std::string &failure) {
  std::int64_t backOff = FIRST_BACK_OFF;
  for (int doubled = 0; doubled < m_failures; ++doubled) {
    backOff = std::min(backOff * 2, LONGEST_BACK_OFF);
  }
  ++m_failures;
  m_notBefore = steady + backOff - std::llround(static_cast<double>(backOff) / 2 * random);
  m_failure = failure;
}

void SourceModel::Accept(const Token &token) {
  m_hasToken = true;
  m_token = token;
  m_failures = 0;
  m_failure = "";
  m_notBefore = INT64_MIN;
  const std::int64_t margin = std::min(MARGIN, (token.end - token.start) / 10);
  m_from = std::min(token.start, wall) - margin;
  m_until = token.end - margin;
  const std::int64_t begin = std::max(token.start, wall);
  m_due = std::min(m_until,
                   begin + static_cast<std::int64_t>((0.8 - 0.1 * random) * static_cast<double>(token.end - begin)));
  m_steadyDue = steady + (m_due - wall) * 1000;
  m_steadyUntil = steady + (m_until - wall) * 1000;
}

void SourceModel::Invalidate(const std::string &id) {
  if (!IsInvalidated(id)) {
    m_invalidated.push_back(id);
  }
  if (m_invalidated.size() > 16) {
    m_invalidated.pop_front();
  }
  if (m_hasToken && m_token.id == id) {
    m_hasToken = false;
    m_isRenewalForbidden = true;
  }
}

bool SourceModel::IsInvalidated(const std::string &id) const {
  return std::find(m_invalidated.begin(), m_invalidated.end(), id) != m_invalidated.end();
}

void SourceModel::End(int call, const std::string &outcome) {
  events.push_back(std::to_string(call) + ": " + outcome);
}

void SourceModel::Advance(std::int64_t time) {
  const std::int64_t end = steady + time;
  while (steady < end) {
    std::int64_t next = end;
    const auto consider = [&](std::int64_t moment) {
      if (moment > steady && moment < next) {
        next = moment;
      }
    };
    for (const auto &call : m_waiting) {
      consider(call.second);
    }
    if (m_isAttempting) {
      consider(m_attemptEnd);
    }
    if (m_hasToken) {
      consider(m_steadyDue);
      consider(m_steadyUntil);
      consider(m_notBefore);
    }
    Reach(next);
  }
}

/// Moves both clocks to `moment`, and does what is due at that moment.
void SourceModel::Reach(std::int64_t moment) {
  // The wall clock shows whole microseconds.
  wall += moment / 1000 - steady / 1000;
  steady = moment;
  for (auto call = m_waiting.begin(); call != m_waiting.end();) {
    if (call->second == steady) {
      End(call->first, LATE);
      call = m_waiting.erase(call);
    } else {
      ++call;
    }
  }
  if (m_hasToken && steady >= m_steadyUntil) {
    m_hasToken = false;
  }
  if (m_isAttempting && steady == m_attemptEnd) {
    EndAttempt(nullptr, LATE);
    return;
  }
  const bool isMoment = steady == m_steadyDue || steady == m_notBefore;
  if (isMoment && !m_isAttempting && m_isAsked && IsUsable() && IsDue() && steady >= m_notBefore) {
    StartAttempt();
  }
}

void SourceModel::Destroy() {
  for (const auto &call : m_waiting) {
    End(call.first, "CancelledException: The operation was cancelled because its token source was destroyed");
  }
  // The service and the clocks remain. A call of the provider that is under way has no effect on the next source.
  SourceModel next;
  next.wall = wall;
  next.steady = steady;
  next.random = random;
  next.events = std::move(events);
  next.m_attempts = m_attempts;
  next.m_requests = m_requests;
  *this = std::move(next);
}

} // namespace Testing
