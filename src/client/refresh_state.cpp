// SPDX-License-Identifier: Apache-2.0

#include "client/refresh_state.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/message_formatter.h>
#include <tarvel/system/date_time.h>

#include <algorithm>
#include <cstddef>
#include <limits>
#include <utility>

namespace SsoClient {

namespace {

/// How many identifiers of invalidated tokens are kept. Only the latest ones can come back, from a file or a service that
/// issues the same token again.
constexpr std::size_t MAX_INVALIDATED = 16;

} // namespace

RefreshState::RefreshState(const TokenSourceOptions &options, std::function<double()> random)
    : m_options(options), m_random(std::move(random)) {}

RefreshState::Decision RefreshState::Ask(const Moment &now) {
  if (IsUsable(now)) {
    const bool isStarted = m_times.IsDue(now) && MayAttempt(now);
    m_isAttempting = m_isAttempting || isStarted;
    return {Answer::TOKEN, isStarted};
  }
  if (m_isAttempting) {
    return {Answer::WAIT, false};
  }
  if (m_failure && !MayAttempt(now)) {
    return {Answer::FAILURE, false};
  }
  m_isAttempting = true;
  return {Answer::WAIT, true};
}

bool RefreshState::OnTimer(const Moment &now, bool isAsked) noexcept {
  if (now.steady >= m_times.steadyUntil) {
    m_token = nullptr;
  }
  if (!isAsked || !IsUsable(now) || !m_times.IsDue(now) || !MayAttempt(now)) {
    return false;
  }
  m_isAttempting = true;
  return true;
}

RefreshState::Result RefreshState::OnAttemptEnded(const Moment &now, const TokenOutcome &outcome, bool isIssued,
                                                  const std::exception_ptr &failure) {
  m_isAttempting = false;
  if (!outcome.HasValue()) {
    return Fail(now, outcome.GetException());
  }
  const std::shared_ptr<const SamlToken> &token = outcome.Get();
  const RefreshTimes times = PlanRefresh(*token, now, isIssued, m_options, m_random());
  if (const std::exception_ptr fault = FindFault(*token, times, now)) {
    return Fail(now, fault);
  }
  if (IsUsable(now) && times.end <= m_times.end) {
    return Fail(now, nullptr);
  }
  m_token = token;
  m_times = times;
  if (!isIssued && times.IsDue(now)) {
    BeginBackOff(now); // the service has failed, or another program asks it
    m_failure = failure;
  } else {
    m_failure = nullptr;
    m_failures = 0;
    m_notBefore = SteadyTime::min();
  }
  return {outcome, true};
}

CachedUse RefreshState::Assess(const Moment &now, const SamlToken &cached) const {
  const RefreshTimes times = PlanRefresh(cached, now, false, m_options, m_random());
  const bool isOlder = IsUsable(now) && times.end <= m_times.end;
  if (isOlder || !times.IsUsable(now) || IsInvalidated(cached.GetId())) {
    return CachedUse::NO;
  }
  return times.IsDue(now) ? CachedUse::DUE : CachedUse::FRESH;
}

void RefreshState::BeginBackOff(const Moment &now) {
  m_failures = std::min(m_failures + 1, std::numeric_limits<int>::max() - 1);
  m_notBefore =
      now.steady + std::chrono::duration_cast<SteadyTime::duration>(GetBackOff(m_failures, m_options, m_random()));
}

/// @param failure null if the attempt brought a token that is not fresher than the usable one, which stays
RefreshState::Result RefreshState::Fail(const Moment &now, std::exception_ptr failure) {
  BeginBackOff(now);
  m_failure = std::move(failure);
  if (IsUsable(now)) {
    return {m_token, false};
  }
  return {m_failure, false};
}

std::exception_ptr RefreshState::FindFault(const SamlToken &token, const RefreshTimes &times, const Moment &now) const {
  if (IsInvalidated(token.GetId())) {
    return std::make_exception_ptr(SsoException(
        Tarvel::MessageFormatter::ASPrint("The service issued a token again that was invalidated: %1", token.GetId())));
  }
  if (!times.IsUsable(now)) {
    return std::make_exception_ptr(SsoException(Tarvel::MessageFormatter::ASPrint(
        "The service issued a token that has expired or is about to expire: it ends at %1, and it is %2",
        token.GetEndDate(), Tarvel::System::DateTimeFromUtc(now.system, false))));
  }
  return nullptr;
}

bool RefreshState::Invalidate(const std::string &tokenId) {
  if (!IsInvalidated(tokenId)) {
    m_invalidated.push_back(tokenId);
  }
  if (m_invalidated.size() > MAX_INVALIDATED) {
    m_invalidated.pop_front();
  }
  if (!m_token || m_token->GetId() != tokenId) {
    return false;
  }
  m_token = nullptr;
  return true;
}

bool RefreshState::IsInvalidated(const std::string &tokenId) const noexcept {
  return std::find(m_invalidated.begin(), m_invalidated.end(), tokenId) != m_invalidated.end();
}

std::shared_ptr<const SamlToken> RefreshState::GetRenewable(const Moment &now) const {
  const bool isRenewable = m_token && now.system < m_times.end && m_token->IsRenewable() &&
                           m_token->GetConfirmationMethod() == SamlToken::HOLDER_OF_KEY;
  return isRenewable ? m_token : nullptr;
}

std::int64_t RefreshState::GetQuietUntil(const Moment &now) const noexcept {
  if (m_isAttempting) {
    return m_times.usableUntil;
  }
  if (now.steady < m_notBefore) {
    const auto rest = std::chrono::duration_cast<std::chrono::microseconds>(m_notBefore - now.steady).count();
    return std::min(m_times.usableUntil, std::max(m_times.dueAt, now.system + rest));
  }
  return m_times.IsDue(now) ? std::numeric_limits<std::int64_t>::min() : m_times.dueAt;
}

boost::optional<RefreshState::SteadyTime> RefreshState::GetTimer(const Moment &now) const noexcept {
  if (!m_token) {
    return boost::none;
  }
  // A due token that no caller asks for is not refreshed, but it ends. If the clock has been set and the token is not usable,
  // it may become usable again.
  SteadyTime next = m_times.steadyUntil;
  for (const SteadyTime time : {m_times.steadyDueAt, m_notBefore}) {
    if (!m_isAttempting && time > now.steady) {
      next = std::min(next, time);
    }
  }
  return next;
}

} // namespace SsoClient
