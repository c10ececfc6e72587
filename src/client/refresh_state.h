// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RefreshState`, which decides when a source returns its token and when it asks for another one.

#pragma once

#include "client/refresh_times.h"

#include <ssoclient/client/outcome.h>
#include <ssoclient/client/token_source.h>

#include <boost/optional.hpp>

#include <deque>
#include <exception>
#include <functional>
#include <memory>
#include <string>

namespace SsoClient {

/// How a source may use a token of the file cache.
enum class CachedUse {
  NO,   ///< it is not returned
  DUE,  ///< it may be returned, and must be refreshed
  FRESH ///< it is like a new one
};

/// The state of a token source, without clocks, threads or requests: each function is called with the present time and reports
/// what must be done. For one thread at a time.
///
/// The token of the source is absent, fresh, due or not usable. A fresh or a due token is returned. One attempt at a
/// time gets another one; after a failed attempt, no other is made for some time.
class RefreshState {
public:
  using SteadyTime = RefreshTimes::SteadyTime;

  /// What a call that asks for the token does.
  enum class Answer {
    TOKEN,  ///< it returns the token
    WAIT,   ///< it waits for the attempt that is under way or starts now
    FAILURE ///< it ends with the failure of the last attempt
  };

  struct Decision {
    Answer answer;
    bool isAttemptStarted; ///< whether the caller must start an attempt
  };

  struct Result {
    TokenOutcome outcome; ///< for the calls that wait
    bool isNew;           ///< whether the source has another token than before
  };

  /// @param random returns numbers between 0 and 1
  RefreshState(const TokenSourceOptions &options, std::function<double()> random);

  /// A caller asks for the token.
  Decision Ask(const Moment &now);

  /// The time that `GetTimer` returned has been reached. A due token that callers ask for is refreshed, and an ended
  /// one is dropped.
  /// @param isAsked whether a caller has asked since the last attempt ended
  /// @return whether the caller must start an attempt
  bool OnTimer(const Moment &now, bool isAsked) noexcept;

  /// The attempt that was started has ended.
  /// @param isIssued whether the service has issued the token for this attempt; otherwise it is from a file
  /// @param failure why it has not, if the attempt failed and a due token of the file is used; otherwise null
  Result OnAttemptEnded(const Moment &now, const TokenOutcome &outcome, bool isIssued,
                        const std::exception_ptr &failure);

  /// How a token of the file cache may be used now.
  CachedUse Assess(const Moment &now, const SamlToken &cached) const;

  /// No attempt is under way: the one that was started could not be created, has failed, or is the parent's in a child
  /// of `fork`.
  void ForgetAttempt() noexcept { m_isAttempting = false; }

  /// The token with this identifier is not returned again.
  /// @return whether it was the token of the source
  bool Invalidate(const std::string &tokenId);

  /// Whether the token with this identifier has been invalidated.
  bool IsInvalidated(const std::string &tokenId) const noexcept;

  /// Why the last attempt failed. Not null after the answer `FAILURE`.
  const std::exception_ptr &GetFailure() const noexcept { return m_failure; }

  /// The token, which may be unusable; null if there is none.
  const std::shared_ptr<const SamlToken> &GetToken() const noexcept { return m_token; }
  const RefreshTimes &GetTimes() const noexcept { return m_times; }

  /// The token if it can be renewed; otherwise null.
  std::shared_ptr<const SamlToken> GetRenewable(const Moment &now) const;

  /// Until which wall-clock time callers may get the token without `Ask`; microseconds since 1970, UTC.
  std::int64_t GetQuietUntil(const Moment &now) const noexcept;

  /// When `OnTimer` must be called, if nothing else happens before.
  boost::optional<SteadyTime> GetTimer(const Moment &now) const noexcept;

private:
  bool MayAttempt(const Moment &now) const noexcept { return !m_isAttempting && now.steady >= m_notBefore; }
  bool IsUsable(const Moment &now) const noexcept { return m_token && m_times.IsUsable(now); }
  void BeginBackOff(const Moment &now);
  Result Fail(const Moment &now, std::exception_ptr failure);
  std::exception_ptr FindFault(const SamlToken &token, const RefreshTimes &times, const Moment &now) const;

  const TokenSourceOptions m_options;
  const std::function<double()> m_random;
  std::shared_ptr<const SamlToken> m_token;
  RefreshTimes m_times; // of the token
  bool m_isAttempting = false;
  int m_failures = 0; // attempts in a row that brought no other token
  SteadyTime m_notBefore = SteadyTime::min();
  std::exception_ptr m_failure; // of the last attempt; null if it has not failed
  std::deque<std::string> m_invalidated;
};

} // namespace SsoClient
