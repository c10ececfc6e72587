// SPDX-License-Identifier: Apache-2.0

#include "client/token_source_core.h"

#include "client/cache_removal.h"
#include "client/delivery.h"

#include <ssoclient/client/exceptions.h>

#include <condition_variable>
#include <mutex>
#include <new>
#include <random>
#include <utility>

namespace SsoClient {

namespace {

/// The outcome of a call that waits.
class AwaitedOutcome {
public:
  void Set(const TokenOutcome &outcome) {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    m_outcome = outcome;
    m_isSet.notify_all();
  }

  std::shared_ptr<const SamlToken> Wait() {
    std::unique_lock<Tarvel::ForkSafeMutex> lock(m_mutex);
    m_isSet.wait(lock, [this] { return m_outcome.has_value(); });
    return m_outcome->Get();
  }

private:
  Tarvel::ForkSafeMutex m_mutex; // guards all that follows
  std::condition_variable_any m_isSet;
  boost::optional<TokenOutcome> m_outcome;
};

void RunHere(const std::function<void()> &function) {
  function();
}

std::exception_ptr MakeClosed() {
  return std::make_exception_ptr(
      CancelledException("The operation was cancelled because its token source was destroyed"));
}

std::shared_ptr<RefreshSupplies> MakeSupplies(const TokenSourceSetup &setup) {
  return std::make_shared<RefreshSupplies>(
      RefreshSupplies{setup.time, setup.issuer, std::make_shared<CredentialRequests>(setup.provider, setup.blocking),
                      setup.cache, setup.blocking, setup.spec, setup.options.attemptTimeout});
}

} // namespace

double DrawRandom() {
  std::random_device device;
  return std::uniform_real_distribution<double>()(device);
}

TokenSourceCore::TokenSourceCore(const TokenSourceSetup &setup)
    : m_setup(setup), m_supplies(MakeSupplies(setup)),
      m_listeners(std::make_shared<ChangeListeners>(setup.options.executor)), m_generation(Tarvel::GetForkGeneration()),
      m_state(setup.options, setup.random) {}

std::shared_ptr<const SamlToken> TokenSourceCore::Get(const GetOptions &options) {
  if (options.deadline || options.cancelToken.CanBeCancelled()) {
    if (const std::exception_ptr early = FindEarlyEnd(options, CancelToken(), m_setup.time)) {
      std::rethrow_exception(early);
    }
  }
  if (std::shared_ptr<const SamlToken> token = ReadPublished()) {
    return token;
  }
  const std::shared_ptr<TokenSourceCore> self = shared_from_this(); // the source may be destroyed during the call
  const auto awaited = std::make_shared<AwaitedOutcome>();
  Join(options, CancelToken(),
       TokenWaiter::Create(RunHere, [awaited](const TokenOutcome &outcome) { awaited->Set(outcome); }));
  return awaited->Wait();
}

void TokenSourceCore::GetAsync(const GetOptions &options, const CancelToken &otherToken, TokenCallback callback) {
  const auto waiter =
      TokenWaiter::Create(options.executor ? options.executor : m_setup.options.executor, std::move(callback));
  if (const std::exception_ptr early = FindEarlyEnd(options, otherToken, m_setup.time)) {
    waiter->Deliver(early);
  } else if (std::shared_ptr<const SamlToken> token = ReadPublished()) {
    waiter->Deliver(token);
  } else {
    Join(options, otherToken, waiter);
  }
}

std::future<std::shared_ptr<const SamlToken>> TokenSourceCore::GetFuture(const GetOptions &options) {
  const auto promise = std::make_shared<std::promise<std::shared_ptr<const SamlToken>>>();
  GetOptions here(options);
  here.executor = RunHere;
  GetAsync(here, CancelToken(), [promise](const TokenOutcome &outcome) {
    if (outcome.HasValue()) {
      promise->set_value(outcome.Get());
    } else {
      promise->set_exception(outcome.GetException());
    }
  });
  return promise->get_future();
}

/// The token, if it can be returned and nothing else must be done. Takes no lock.
std::shared_ptr<const SamlToken> TokenSourceCore::ReadPublished() {
  const auto now = m_setup.time.GetSystemTime().time_since_epoch();
  std::shared_ptr<const SamlToken> token =
      m_published.Read(std::chrono::duration_cast<std::chrono::microseconds>(now).count());
  // Not written each time, so that readers on different processors do not slow each other down.
  if (token && !m_isAsked.load(std::memory_order_relaxed)) {
    m_isAsked.store(true, std::memory_order_relaxed);
  }
  return token;
}

/// Ends the call of `waiter` at once or lets it wait for the attempt, which starts if none is under way.
void TokenSourceCore::Join(const GetOptions &options, const CancelToken &otherToken,
                           const std::shared_ptr<TokenWaiter> &waiter) {
  boost::optional<TokenOutcome> outcome;
  std::shared_ptr<RefreshAttempt> attempt;
  const Moment now = ReadClocks(m_setup.time);
  std::uint64_t number = 0;
  try {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    AdoptInChild();
    number = ++m_calls;
    outcome = Ask(now, number, waiter, attempt);
  } catch (...) {
    waiter->Withdraw(); // no memory: the waiter owns itself until its end is decided
    throw;
  }
  if (outcome) {
    waiter->Deliver(*outcome);
  }
  if (attempt) {
    attempt->Start();
  }
  if (outcome) {
    return;
  }
  try {
    waiter->Arm(options, otherToken, m_setup.time, [weak = weak_from_this(), number] {
      if (const std::shared_ptr<TokenSourceCore> self = weak.lock()) {
        self->RemoveWaiter(number);
      }
    });
  } catch (...) {
    if (waiter->Withdraw()) {
      RemoveWaiter(number);
      throw;
    }
  }
}

/// The outcome of the call with this number; `boost::none` if the call waits. Called under the lock.
/// @param attempt is set to the attempt that the caller must start without the lock
/// @throws std::bad_alloc; the call does not wait then
boost::optional<TokenOutcome> TokenSourceCore::Ask(const Moment &now, std::uint64_t number,
                                                   const std::shared_ptr<TokenWaiter> &waiter,
                                                   std::shared_ptr<RefreshAttempt> &attempt) {
  if (m_isClosed) {
    return TokenOutcome(MakeClosed());
  }
  m_isAsked.store(true, std::memory_order_relaxed);
  const RefreshState::Decision decision = m_state.Ask(now);
  try {
    if (decision.answer == RefreshState::Answer::WAIT) {
      m_waiters.emplace(number, waiter);
    }
    if (decision.isAttemptStarted) {
      attempt = CreateAttempt(now);
    }
  } catch (...) {
    m_waiters.erase(number);
    if (decision.isAttemptStarted) {
      m_state.ForgetAttempt();
    }
    throw;
  }
  Update(now, false);
  switch (decision.answer) {
  case RefreshState::Answer::TOKEN:
    return TokenOutcome(m_state.GetToken());
  case RefreshState::Answer::FAILURE:
    return TokenOutcome(m_state.GetFailure());
  case RefreshState::Answer::WAIT:
    break;
  }
  return boost::none;
}

void TokenSourceCore::RemoveWaiter(std::uint64_t number) noexcept {
  std::shared_ptr<TokenWaiter> removed; // destroyed outside the lock
  const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
  const auto place = m_waiters.find(number);
  if (place != m_waiters.end()) {
    removed = std::move(place->second);
    m_waiters.erase(place);
  }
}

/// The next attempt, which the caller starts without the lock. Called under the lock.
std::shared_ptr<RefreshAttempt> TokenSourceCore::CreateAttempt(const Moment &now) {
  const auto self = shared_from_this();
  const std::uint64_t number = m_attempts + 1;
  m_attempt = std::make_shared<RefreshAttempt>(
      m_supplies, m_state.GetRenewable(now),
      [self](const SamlToken &cached) {
        const Moment then = ReadClocks(self->m_setup.time);
        const std::lock_guard<Tarvel::ForkSafeMutex> lock(self->m_mutex);
        return self->m_state.Assess(then, cached);
      },
      [self, number](const TokenOutcome &outcome, bool isIssued, const std::exception_ptr &failure) {
        self->OnAttemptEnded(number, outcome, isIssued, failure);
      });
  m_attempts = number;
  return m_attempt;
}

void TokenSourceCore::OnAttemptEnded(std::uint64_t number, const TokenOutcome &outcome, bool isIssued,
                                     const std::exception_ptr &failure) noexcept {
  const Moment now = ReadClocks(m_setup.time);
  RefreshState::Result result{outcome, false};
  std::shared_ptr<RefreshAttempt> ended; // destroyed outside the lock, like the calls that waited
  Waiters waiters;
  bool isListened = false;
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (m_isClosed || number != m_attempts || m_generation != Tarvel::GetForkGeneration()) {
      return;
    }
    ended.swap(m_attempt);
    try {
      result = m_state.OnAttemptEnded(now, outcome, isIssued, failure);
    } catch (...) {
      m_state.ForgetAttempt();
      result.outcome = std::current_exception();
    }
    m_isAsked.store(false, std::memory_order_relaxed);
    waiters.swap(m_waiters);
    Update(now, result.isNew);
    isListened = result.isNew && QueueChange();
  }
  for (const auto &waiter : waiters) {
    waiter.second->Deliver(result.outcome);
  }
  if (isListened) {
    m_listeners->ScheduleNext();
  }
}

/// Queues the calls for the present token. Called under the lock: a callback of this one may already get the next token.
/// @return whether they must be scheduled, without the lock
bool TokenSourceCore::QueueChange() noexcept {
  try {
    return m_listeners->Queue(m_state.GetToken());
  } catch (...) {
    return false; // no memory: the functions are not called with this token
  }
}

void TokenSourceCore::OnTimer() {
  const Moment now = ReadClocks(m_setup.time);
  std::shared_ptr<RefreshAttempt> attempt;
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (m_isClosed || m_generation != Tarvel::GetForkGeneration()) {
      return;
    }
    m_timerAt = boost::none;
    if (m_state.OnTimer(now, m_isAsked.load(std::memory_order_relaxed))) {
      try {
        attempt = CreateAttempt(now);
      } catch (...) {
        m_state.ForgetAttempt(); // no memory: the next call that asks tries again
      }
    }
    Update(now, false);
  }
  if (attempt) {
    attempt->Start();
  }
}

void TokenSourceCore::Invalidate(const std::string &tokenId) {
  {
    const Moment now = ReadClocks(m_setup.time);
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    AdoptInChild();
    if (m_state.Invalidate(tokenId) && m_attempt) {
      m_attempt->ForbidRenewal();
    }
    Update(now, false);
  }
  if (m_supplies->cache) {
    RemoveFromCache(m_supplies, tokenId);
  }
}

std::shared_ptr<void> TokenSourceCore::OnChange(ChangeListeners::Function function) {
  return m_listeners->Add(std::move(function));
}

void TokenSourceCore::Close() noexcept {
  m_listeners->Close();
  m_supplies->credentials->Close();
  std::shared_ptr<RefreshAttempt> attempt;
  Waiters waiters;
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    AdoptInChild();
    m_isClosed = true;
    attempt.swap(m_attempt);
    waiters.swap(m_waiters);
    m_published.Clear();
    UpdateTimer({});
  }
  if (attempt) {
    attempt->Cancel();
  }
  const std::exception_ptr closed = waiters.empty() ? nullptr : MakeClosed();
  for (const auto &waiter : waiters) {
    waiter.second->Deliver(closed);
  }
}

/// Makes readers and the timer follow the state. Called under the lock, after each change.
/// @param isNew whether the source has another token than before
void TokenSourceCore::Update(const Moment &now, bool isNew) noexcept {
  const std::shared_ptr<const SamlToken> &token = m_state.GetToken();
  const std::int64_t until = m_state.GetQuietUntil(now);
  if (!token) {
    m_published.Clear();
  } else if (isNew) {
    try {
      m_published.Publish(token, m_state.GetTimes().usableFrom, until);
    } catch (...) {
      m_published.Clear(); // no memory: each call asks under the lock
    }
  } else {
    m_published.SetUntil(until);
  }
  UpdateTimer(now);
}

void TokenSourceCore::UpdateTimer(const Moment &now) noexcept {
  const boost::optional<RefreshState::SteadyTime> next = m_isClosed ? boost::none : m_state.GetTimer(now);
  if (next == m_timerAt) {
    return;
  }
  if (m_timer) {
    m_timer->Cancel();
    m_timer.reset();
  }
  m_timerAt = boost::none;
  if (!next) {
    return;
  }
  try {
    m_timer = m_setup.time.StartTimer(*next, [weak = weak_from_this()] {
      if (const std::shared_ptr<TokenSourceCore> self = weak.lock()) {
        self->OnTimer();
      }
    });
    m_timerAt = next;
  } catch (...) {
    // No thread or no memory: the next call that asks tries again.
    m_timerAt = boost::none;
  }
}

/// In a child of the process that used the source last, forgets what is under way in that process. Called under the
/// lock.
void TokenSourceCore::AdoptInChild() noexcept {
  if (m_generation == Tarvel::GetForkGeneration()) {
    return;
  }
  // Never destroyed, because a destructor could end what the parent does, or call code of the host.
  static std::atomic<OfParent *> allOfParents{nullptr};
  auto *const ofParent = new (std::nothrow) OfParent{std::move(m_waiters), std::move(m_attempt), allOfParents.load()};
  if (ofParent) {
    allOfParents.store(ofParent);
  }
  m_generation = Tarvel::GetForkGeneration();
  m_waiters.clear();
  m_attempt = nullptr;
  m_timer.reset();
  m_timerAt = boost::none;
  m_state.ForgetAttempt();
  m_supplies->credentials->ForgetCall();
  m_listeners->ForgetCalls();
}

} // namespace SsoClient
