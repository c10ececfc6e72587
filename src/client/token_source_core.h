// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenSourceCore`, a token source over any issuer, clock and executor.

#pragma once

#include "client/change_listeners.h"
#include "client/published_token.h"
#include "client/refresh_attempt.h"
#include "client/refresh_state.h"
#include "client/token_waiter.h"

#include <ssoclient/client/token_source.h>
#include <tarvel/core/fork_safe_mutex.h>

#include <atomic>
#include <cstdint>
#include <exception>
#include <functional>
#include <future>
#include <map>
#include <memory>
#include <string>

namespace SsoClient {

/// What a source is made of.
struct TokenSourceSetup {
  const TimeSource &time;
  std::shared_ptr<const TokenIssuer> issuer;
  CredentialProvider provider;
  TokenSpec spec;
  TokenSourceOptions options;
  std::shared_ptr<const TokenCacheFile> cache; ///< null without one
  Executor blocking;                           ///< runs functions that may block, on other threads
  std::function<double()> random;              ///< returns numbers between 0 and 1; called by one thread at a time
};

/// A random number between 0 and 1, different in each process.
double DrawRandom();

/// Joins the state of the source, the attempts, the calls that wait and the token that readers find without a lock. Its
/// lock is never held while code of the host runs. Shared by its `TokenSource` and by what is under way.
class TokenSourceCore : public std::enable_shared_from_this<TokenSourceCore> {
public:
  explicit TokenSourceCore(const TokenSourceSetup &setup);
  TokenSourceCore(const TokenSourceCore &) = delete;
  TokenSourceCore &operator=(const TokenSourceCore &) = delete;
  ~TokenSourceCore() = default;

  /// Like `TokenSource::Get`.
  std::shared_ptr<const SamlToken> Get(const GetOptions &options);

  /// Like `TokenSource::GetAsync`; `otherToken` cancels the call, too.
  void GetAsync(const GetOptions &options, const CancelToken &otherToken, TokenCallback callback);

  /// Like `TokenSource::GetFuture`.
  std::future<std::shared_ptr<const SamlToken>> GetFuture(const GetOptions &options);

  /// Like `TokenSource::Invalidate`.
  void Invalidate(const std::string &tokenId);

  /// Registers `function` until the returned object is destroyed.
  std::shared_ptr<void> OnChange(ChangeListeners::Function function);

  /// Cancels what is under way. Called once, before the owner releases the core.
  void Close() noexcept;

private:
  using Waiters = std::map<std::uint64_t, std::shared_ptr<TokenWaiter>>;

  /// What a parent process has under way.
  struct OfParent {
    Waiters waiters;
    std::shared_ptr<RefreshAttempt> attempt;
    OfParent *next;
  };

  std::shared_ptr<const SamlToken> ReadPublished();
  void Join(const GetOptions &options, const CancelToken &otherToken, const std::shared_ptr<TokenWaiter> &waiter);
  boost::optional<TokenOutcome> Ask(const Moment &now, std::uint64_t number, const std::shared_ptr<TokenWaiter> &waiter,
                                    std::shared_ptr<RefreshAttempt> &attempt);
  void RemoveWaiter(std::uint64_t number) noexcept;
  std::shared_ptr<RefreshAttempt> CreateAttempt(const Moment &now);
  void OnAttemptEnded(std::uint64_t number, const TokenOutcome &outcome, bool isIssued,
                      const std::exception_ptr &failure) noexcept;
  bool QueueChange() noexcept;
  void OnTimer();
  void Update(const Moment &now, bool isNew) noexcept;
  void UpdateTimer(const Moment &now) noexcept;
  void AdoptInChild() noexcept;

  const TokenSourceSetup m_setup;
  const std::shared_ptr<RefreshSupplies> m_supplies;
  const std::shared_ptr<ChangeListeners> m_listeners;
  PublishedToken m_published;         // written under the lock
  std::atomic<bool> m_isAsked{false}; // since the last attempt ended

  Tarvel::ForkSafeMutex m_mutex; // guards all that follows
  unsigned m_generation;         // of the process that has used the source last
  bool m_isClosed = false;
  RefreshState m_state;
  Waiters m_waiters; // by their numbers, in the order of the calls
  std::uint64_t m_calls = 0;
  std::shared_ptr<RefreshAttempt> m_attempt; // under way
  std::uint64_t m_attempts = 0;              // so far; the number of the latest
  boost::optional<RefreshState::SteadyTime> m_timerAt;
  Tarvel::Ref<Tarvel::System::ScheduledItem> m_timer;
};

} // namespace SsoClient
