// SPDX-License-Identifier: Apache-2.0

#include "client/token_waiter.h"

#include "client/delivery.h"

#include <ssoclient/client/exceptions.h>

#include <mutex>
#include <utility>

namespace SsoClient {

namespace {

std::exception_ptr MakeCancelled() {
  return std::make_exception_ptr(CancelledException("The operation was cancelled"));
}

std::exception_ptr MakeLate() {
  return std::make_exception_ptr(DeadlineExceededException("The deadline passed before the operation ended"));
}

} // namespace

TokenWaiter::TokenWaiter(Executor executor, TokenCallback callback)
    : m_executor(std::move(executor)), m_callback(std::move(callback)) {}

std::shared_ptr<TokenWaiter> TokenWaiter::Create(Executor executor, TokenCallback callback) {
  std::shared_ptr<TokenWaiter> waiter(new TokenWaiter(std::move(executor), std::move(callback)),
                                      [](TokenWaiter *ended) { delete ended; });
  waiter->m_delivery = [waiter] {
    const TokenCallback function = std::exchange(waiter->m_callback, nullptr);
    function(*waiter->m_outcome);
  };
  return waiter;
}

void TokenWaiter::Arm(const GetOptions &options, const CancelToken &otherToken, const TimeSource &time,
                      const std::function<void()> &onEnded) {
  if (m_isDecided.load()) {
    return;
  }
  const auto endWith = [weak = weak_from_this(), onEnded](std::exception_ptr (*makeException)()) {
    const std::shared_ptr<TokenWaiter> self = weak.lock();
    if (self && self->Deliver(makeException())) {
      onEnded();
    }
  };
  TimerItem timer;
  if (options.deadline) {
    timer = time.StartTimer(*options.deadline, [endWith] { endWith(MakeLate); });
  }
  Registrations registrations;
  try {
    const auto cancel = [endWith] { endWith(MakeCancelled); };
    registrations = {options.cancelToken.OnCancel(cancel), otherToken.OnCancel(cancel)};
  } catch (...) {
    if (timer) {
      timer->Cancel();
    }
    throw;
  }
  Keep(std::move(timer), std::move(registrations));
}

/// Keeps what ends the call, or releases it if the call has ended.
void TokenWaiter::Keep(TimerItem timer, Registrations registrations) {
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (!m_isDecided.load()) {
      std::swap(m_timer, timer);
      std::swap(m_registrations, registrations);
    }
  }
  if (timer) {
    timer->Cancel();
  }
}

bool TokenWaiter::Deliver(const TokenOutcome &outcome) noexcept {
  if (!Decide()) {
    return false;
  }
  m_outcome = outcome;
  RunOn(m_executor, std::exchange(m_delivery, nullptr));
  return true;
}

bool TokenWaiter::Withdraw() noexcept {
  if (!Decide()) {
    return false;
  }
  m_delivery = nullptr; // refers to this object
  return true;
}

/// Whether the caller may end the call. Releases the timer and the registrations, which could end the call, too.
bool TokenWaiter::Decide() noexcept {
  if (m_isDecided.exchange(true)) {
    return false;
  }
  TimerItem timer;
  Registrations registrations; // destroyed outside the lock
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    timer = std::exchange(m_timer, nullptr);
    std::swap(registrations, m_registrations);
  }
  if (timer) {
    timer->Cancel();
  }
  return true;
}

std::exception_ptr FindEarlyEnd(const GetOptions &options, const CancelToken &otherToken, const TimeSource &time) {
  if (options.cancelToken.IsCancelled() || otherToken.IsCancelled()) {
    return MakeCancelled();
  }
  if (options.deadline && *options.deadline <= time.GetSteadyTime()) {
    return MakeLate();
  }
  return nullptr;
}

} // namespace SsoClient
