// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SourceModel`, a simple model of a token source, written independently of it.

#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <string>
#include <vector>

namespace Testing {

/// A source with the options that the model test uses. It has no timers: `Advance` moves from one moment at which
/// something may happen to the next. `events` collects the outcomes of calls and the requests to the service, in order.
///
/// Wall-clock times are in microseconds, and times of the steady clock in nanoseconds.
class SourceModel {
public:
  static constexpr std::int64_t MARGIN = 30'000'000;
  static constexpr std::int64_t ATTEMPT_TIMEOUT = 30'000'000'000;
  static constexpr std::int64_t FIRST_BACK_OFF = 1'000'000'000;
  static constexpr std::int64_t LONGEST_BACK_OFF = 8'000'000'000;
  static constexpr std::int64_t NO_DEADLINE = INT64_MAX;

  struct Token {
    std::string id;
    std::int64_t start = 0;
    std::int64_t end = 0;
    bool isRenewable = false;
  };

  std::int64_t wall = 0;
  std::int64_t steady = 0;
  double random = 0;
  std::vector<std::string> events;

  void Ask(int call, std::int64_t deadline);
  void Cancel(int call);
  /// The oldest request is answered; with a failure if `token` is null.
  void Answer(const Token *token);
  /// The oldest call of the provider returns, or throws.
  void EndProvider(bool succeeds);
  void Invalidate(const std::string &id);
  void Advance(std::int64_t time);
  void Destroy();

  bool HasRequest() const { return !m_requests.empty(); }
  bool HasProviderCall() const { return m_isProviderCalled; }
  bool IsWaiting() const { return !m_waiting.empty(); }
  const Token *GetToken() const { return m_hasToken ? &m_token : nullptr; }

private:
  struct Request {
    int attempt;
    bool isRenewal;
  };

  bool IsUsable() const { return m_hasToken && wall >= m_from && wall < m_until && steady < m_steadyUntil; }
  bool IsDue() const { return wall >= m_due || steady >= m_steadyDue; }
  void StartAttempt();
  void AskProvider();
  void EndAttempt(const Token *token, const std::string &failure);
  void Fail(const std::string &failure);
  void Accept(const Token &token);
  void End(int call, const std::string &outcome);
  void Reach(std::int64_t moment);
  bool IsInvalidated(const std::string &id) const;

  bool m_hasToken = false;
  Token m_token;
  std::int64_t m_from = 0, m_due = 0, m_until = 0, m_steadyDue = 0, m_steadyUntil = 0;
  bool m_isAsked = false;
  int m_failures = 0;
  std::int64_t m_notBefore = INT64_MIN;
  std::string m_failure;
  std::deque<std::string> m_invalidated;
  std::map<int, std::int64_t> m_waiting; // deadlines of the calls
  int m_attempts = 0;
  bool m_isAttempting = false;
  bool m_waitsForProvider = false;
  bool m_isProviderCalled = false;
  bool m_isRenewalForbidden = false;
  std::int64_t m_attemptEnd = 0;
  std::deque<Request> m_requests; // not answered yet, even if their attempts have ended
};

} // namespace Testing
