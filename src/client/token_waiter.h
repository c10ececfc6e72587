// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenWaiter`, a call that waits for the token of a source.

#pragma once

#include "client/time_source.h"

#include <ssoclient/client/outcome.h>
#include <ssoclient/client/token_source.h>
#include <tarvel/core/fork_safe_mutex.h>

#include <boost/optional.hpp>

#include <array>
#include <atomic>
#include <exception>
#include <functional>
#include <memory>

namespace SsoClient {

/// Delivers exactly one outcome, from the source, a cancellation or the deadline: the first one. Safe on any thread.
class TokenWaiter : public std::enable_shared_from_this<TokenWaiter> {
public:
  /// @param executor where `callback` runs
  static std::shared_ptr<TokenWaiter> Create(Executor executor, TokenCallback callback);

  TokenWaiter(const TokenWaiter &) = delete;
  TokenWaiter &operator=(const TokenWaiter &) = delete;

  /// Lets the deadline and the cancel tokens of a call end it; `onEnded` is called after such an end. Called at most
  /// once.
  /// @throws std::bad_alloc, Tarvel::InvalidStateException when the timer cannot be started
  void Arm(const GetOptions &options, const CancelToken &otherToken, const TimeSource &time,
           const std::function<void()> &onEnded);

  /// Delivers `outcome`, unless the call has ended. The caller holds no lock.
  /// @return whether it was delivered
  bool Deliver(const TokenOutcome &outcome) noexcept;

  /// Ends the call without an outcome, unless it has ended.
  /// @return whether this ended the call
  bool Withdraw() noexcept;

private:
  TokenWaiter(Executor executor, TokenCallback callback);
  ~TokenWaiter() = default;

  using TimerItem = Tarvel::Ref<Tarvel::System::ScheduledItem>;

  using Registrations = std::array<CancelRegistration, 2>;

  void Keep(TimerItem timer, Registrations registrations);
  bool Decide() noexcept;

  const Executor m_executor;
  TokenCallback m_callback;                // used by the thread that runs it; then null
  std::function<void()> m_delivery;        // made early, so that a delivery needs no memory; null after the decision
  boost::optional<TokenOutcome> m_outcome; // set before the delivery
  std::atomic<bool> m_isDecided{false};
  Tarvel::ForkSafeMutex m_mutex; // guards all that follows
  TimerItem m_timer;
  Registrations m_registrations;
};

/// Checks `options` and `otherToken` before anything is done.
/// @return null, or the exception of a call that is cancelled or late at its start
std::exception_ptr FindEarlyEnd(const GetOptions &options, const CancelToken &otherToken, const TimeSource &time);

} // namespace SsoClient
