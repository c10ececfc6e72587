// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RefreshAttempt`, one attempt of a source to get another token.

#pragma once

#include "client/credential_requests.h"
#include "client/refresh_state.h"
#include "client/time_source.h"
#include "client/token_cache_file.h"
#include "client/token_issuer.h"

#include <ssoclient/client/cancellation.h>
#include <ssoclient/client/outcome.h>
#include <ssoclient/token_spec.h>
#include <tarvel/core/fork_safe_mutex.h>

#include <atomic>
#include <chrono>
#include <exception>
#include <functional>
#include <memory>

namespace SsoClient {

/// What the attempts of one source share.
struct RefreshSupplies {
  const TimeSource &time;
  std::shared_ptr<const TokenIssuer> issuer;
  std::shared_ptr<CredentialRequests> credentials;
  std::shared_ptr<const TokenCacheFile> cache; ///< null without one
  Executor blocking;                           ///< runs functions that may block
  TokenSpec spec;
  std::chrono::milliseconds timeout;
};

/// Renews the token, or acquires one if the renewal fails or is not possible. With a file cache, it first looks into
/// the file, and holds the lock of the file while it asks the service, so that only one of many programs asks. It ends
/// with exactly one outcome, unless it is cancelled, and at the latest when its time is over. Its owner keeps it until
/// then. Safe on any thread.
class RefreshAttempt : public std::enable_shared_from_this<RefreshAttempt> {
public:
  using Assess = std::function<CachedUse(const SamlToken &cached)>;
  /// @param isIssued whether the service has issued the token now
  /// @param failure why it has not, if the token is from the file because the attempt failed; otherwise null
  using Ended = std::function<void(const TokenOutcome &outcome, bool isIssued, const std::exception_ptr &failure)>;

  /// @param renewed the token that is renewed; null to acquire one
  RefreshAttempt(std::shared_ptr<const RefreshSupplies> supplies, std::shared_ptr<const SamlToken> renewed,
                 Assess assess, Ended ended);
  RefreshAttempt(const RefreshAttempt &) = delete;
  RefreshAttempt &operator=(const RefreshAttempt &) = delete;

  /// Each failure is an outcome, which may arrive in this call. The caller holds no lock.
  void Start() noexcept;

  /// Ends the attempt without an outcome.
  void Cancel() noexcept;

  /// A relying party has refused the token that is being renewed.
  void ForbidRenewal() noexcept { m_isRenewalForbidden.store(true); }

private:
  using Step = void (RefreshAttempt::*)();

  std::function<void()> MakeStep(Step step);
  void StartTimer();
  void ShortenDeadline();
  void OpenCache();
  void LookIntoCache();
  bool UseCached();
  void AskService();
  void Acquire();
  void OnCredential(const Credential &credential);
  void OnIssued(const TokenOutcome &outcome);
  void WriteCache();
  CallOptions MakeCallOptions() const;
  void End(const TokenOutcome &outcome, bool isIssued, const std::exception_ptr &failure = nullptr) noexcept;
  bool IsStillUsable(const SamlToken &cached) const noexcept;
  void Fail(const std::exception_ptr &failure) noexcept;
  void FailLate() noexcept;
  Ended Decide() noexcept;

  const std::shared_ptr<const RefreshSupplies> m_supplies;
  const std::shared_ptr<const SamlToken> m_renewed;
  const Assess m_assess;
  const CancelSource m_cancel;
  TimeSource::SteadyClock::time_point m_deadline;
  std::atomic<bool> m_isRenewalForbidden{false};
  std::atomic<bool> m_isDecided{false};

  Tarvel::ForkSafeMutex m_mutex; // guards all that follows
  Ended m_ended;                 // null after the decision
  Tarvel::Ref<Tarvel::System::ScheduledItem> m_timer;
  std::unique_ptr<TokenCacheFile::Lock> m_lock;
  // The attempt ends with this token if it fails: a token of the file that is due, or the issued one, while it is
  // written.
  std::shared_ptr<const SamlToken> m_fallback;
  bool m_isFallbackIssued = false;
};

} // namespace SsoClient
