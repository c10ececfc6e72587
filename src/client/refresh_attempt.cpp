// SPDX-License-Identifier: Apache-2.0

#include "client/refresh_attempt.h"

#include <ssoclient/client/exceptions.h>
#include <ssoclient/logger.h>

#include <algorithm>
#include <exception>
#include <mutex>
#include <utility>

namespace SsoClient {

namespace {

/// How long an attempt waits before it tries again to lock a file that another program has locked.
constexpr std::chrono::milliseconds LOCK_STEP{20};

/// How long the service may take if the file has a token that may be returned. A caller must not wait long, or be late,
/// because a service does not answer that is not needed yet.
constexpr std::chrono::seconds PATIENCE_WITH_TOKEN{2};

constexpr int LOG_LEVEL_WARNING = 8;

} // namespace

RefreshAttempt::RefreshAttempt(std::shared_ptr<const RefreshSupplies> supplies,
                               std::shared_ptr<const SamlToken> renewed, Assess assess, Ended ended)
    : m_supplies(std::move(supplies)), m_renewed(std::move(renewed)), m_assess(std::move(assess)),
      m_ended(std::move(ended)) {}

void RefreshAttempt::Start() noexcept {
  try {
    m_deadline = m_supplies->time.GetSteadyTime() + m_supplies->timeout;
    StartTimer();
    if (m_supplies->cache) {
      OpenCache();
    } else {
      AskService();
    }
  } catch (...) {
    Fail(std::current_exception());
  }
}

/// A function that does `step` unless the attempt has ended. What `step` throws ends the attempt.
std::function<void()> RefreshAttempt::MakeStep(Step step) {
  return [self = shared_from_this(), step] {
    try {
      if (!self->m_isDecided.load()) {
        ((*self).*step)();
      }
    } catch (...) {
      self->Fail(std::current_exception());
    }
  };
}

void RefreshAttempt::StartTimer() {
  auto timer = m_supplies->time.StartTimer(m_deadline, [weak = weak_from_this()] {
    if (const std::shared_ptr<RefreshAttempt> self = weak.lock()) {
      self->FailLate();
      self->m_cancel.Cancel(); // afterwards: a request that ends at once because of it does not decide the outcome
    }
  });
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (m_ended) {
      std::swap(m_timer, timer);
    }
  }
  if (timer) {
    timer->Cancel();
  }
}

/// The attempt ends earlier if it has a token of the file.
void RefreshAttempt::ShortenDeadline() {
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (!m_fallback) {
      return;
    }
  }
  m_deadline = std::min(m_deadline, m_supplies->time.GetSteadyTime() + PATIENCE_WITH_TOKEN);
  StartTimer();
}

void RefreshAttempt::OpenCache() {
  m_supplies->blocking(MakeStep(&RefreshAttempt::LookIntoCache));
}

/// If the file has no fresh token, locks the file and asks the service. If another program has locked the file, that
/// program asks.
void RefreshAttempt::LookIntoCache() {
  if (UseCached()) {
    return;
  }
  std::unique_ptr<TokenCacheFile::Lock> fileLock = m_supplies->cache->TryLock();
  if (!fileLock) {
    std::shared_ptr<const SamlToken> fallback;
    {
      const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
      fallback = m_fallback;
    }
    if (fallback) {
      End(fallback, false);
    } else {
      m_supplies->time.StartTimer(m_supplies->time.GetSteadyTime() + LOCK_STEP, MakeStep(&RefreshAttempt::OpenCache));
    }
    return;
  }
  // Another program may have written the file before this one locked it.
  if (UseCached()) {
    return;
  }
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (m_ended) {
      m_lock.swap(fileLock);
    }
  }
  ShortenDeadline();
  AskService();
}

/// Ends the attempt with the token of the file if it is fresh.
bool RefreshAttempt::UseCached() {
  const std::shared_ptr<const SamlToken> cached = m_supplies->cache->Read();
  const CachedUse use = cached ? m_assess(*cached) : CachedUse::NO;
  if (use == CachedUse::FRESH) {
    End(cached, false);
    return true;
  }
  const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
  m_fallback = use == CachedUse::DUE ? cached : nullptr;
  return false;
}

void RefreshAttempt::AskService() {
  if (!m_renewed) {
    Acquire();
    return;
  }
  m_supplies->issuer->Renew(m_renewed, m_supplies->spec.tokenLifetimeSec, MakeCallOptions(),
                            [self = shared_from_this()](const TokenOutcome &outcome) {
                              if (outcome.HasValue() && !self->m_isRenewalForbidden.load()) {
                                self->OnIssued(outcome);
                              } else {
                                self->MakeStep (&RefreshAttempt::Acquire)();
                              }
                            });
}

/// The callback does not own the attempt, because the provider may block longer than the attempt lasts.
void RefreshAttempt::Acquire() {
  // A renewal that ends at the deadline can be faster than the timer.
  if (m_deadline <= m_supplies->time.GetSteadyTime()) {
    FailLate();
    return;
  }
  m_supplies->credentials->Request(
      [weak = weak_from_this()](const Outcome<std::shared_ptr<const Credential>> &credential) {
        const std::shared_ptr<RefreshAttempt> self = weak.lock();
        if (!self || self->m_isDecided.load()) {
          return;
        }
        try {
          self->OnCredential(*credential.Get());
        } catch (...) {
          self->Fail(std::current_exception());
        }
      });
}

void RefreshAttempt::OnCredential(const Credential &credential) {
  m_supplies->issuer->Acquire(credential, m_supplies->spec, MakeCallOptions(),
                              [self = shared_from_this()](const TokenOutcome &outcome) { self->OnIssued(outcome); });
}

CallOptions RefreshAttempt::MakeCallOptions() const {
  CallOptions options;
  options.deadline = m_deadline;
  options.cancelToken = m_cancel.GetToken();
  return options;
}

void RefreshAttempt::OnIssued(const TokenOutcome &outcome) {
  if (!outcome.HasValue()) {
    Fail(outcome.GetException());
    return;
  }
  if (!m_supplies->cache) {
    End(outcome, true);
    return;
  }
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    m_fallback = outcome.Get();
    m_isFallbackIssued = true;
  }
  try {
    m_supplies->blocking(MakeStep(&RefreshAttempt::WriteCache));
  } catch (...) {
    Fail(std::current_exception());
  }
}

/// The token is written before it is returned, so that a program that ends after its first token leaves it to the next
/// program.
void RefreshAttempt::WriteCache() {
  std::shared_ptr<const SamlToken> issued;
  std::unique_ptr<TokenCacheFile::Lock> fileLock;
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    issued = m_fallback;
    fileLock.swap(m_lock);
  }
  try {
    if (issued && fileLock) {
      m_supplies->cache->Write(*fileLock, *issued);
    }
  } catch (const std::exception &exception) {
    Tarvel::Service::LogInternal(getLogger(), LOG_LEVEL_WARNING, "The token was not written to the cache: %1",
                                 exception.what());
  }
  fileLock = nullptr;
  if (issued) {
    End(issued, true);
  }
}

void RefreshAttempt::Cancel() noexcept {
  const Ended ignored = Decide();
  m_cancel.Cancel();
}

void RefreshAttempt::End(const TokenOutcome &outcome, bool isIssued, const std::exception_ptr &failure) noexcept {
  if (const Ended ended = Decide()) {
    ended(outcome, isIssued, failure);
  }
}

/// Whether the token of the file may still be returned: it can have ended since the file was read.
bool RefreshAttempt::IsStillUsable(const SamlToken &cached) const noexcept {
  try {
    return m_assess(cached) != CachedUse::NO;
  } catch (...) {
    return false;
  }
}

/// If the attempt has a token already, it ends with that instead of the failure.
void RefreshAttempt::Fail(const std::exception_ptr &failure) noexcept {
  std::shared_ptr<const SamlToken> fallback;
  bool isIssued = false;
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    fallback = m_fallback;
    isIssued = m_isFallbackIssued;
  }
  if (fallback && (isIssued || IsStillUsable(*fallback))) {
    End(fallback, isIssued, failure);
  } else {
    End(failure, false);
  }
}

/// Ends the attempt because its time is over.
void RefreshAttempt::FailLate() noexcept {
  try {
    throw DeadlineExceededException("The deadline passed before the operation ended");
  } catch (...) { // also if there is no memory for the exception
    Fail(std::current_exception());
  }
}

/// Ends the attempt: stops the timer and unlocks the file.
/// @return the function that the caller must call; null if the attempt has ended before
RefreshAttempt::Ended RefreshAttempt::Decide() noexcept {
  Ended ended;
  Tarvel::Ref<Tarvel::System::ScheduledItem> timer;
  std::unique_ptr<TokenCacheFile::Lock> fileLock;
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    ended.swap(m_ended);
    timer = std::exchange(m_timer, nullptr);
    fileLock.swap(m_lock);
    m_isDecided.store(true);
  }
  if (timer) {
    timer->Cancel();
  }
  return ended;
}

} // namespace SsoClient
