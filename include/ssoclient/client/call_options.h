// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CallOptions` and `RetryPolicy`: how long one operation may take, what cancels it, and whether it is tried again.

#pragma once

#include <ssoclient/client/cancellation.h>
#include <ssoclient/client/executor.h>
#include <ssoclient/operation_observer.h>
#include <ssoclient/service_dialect.h>
#include <ssoclient/verify_options.h>

#include <boost/optional.hpp>

#include <algorithm>
#include <chrono>
#include <memory>

namespace SsoClient {

/// When an operation is tried again. By default it never is.
///
/// Only a request that the service cannot have acted upon is repeated. Either no connection was made for it (or the TLS
/// handshake failed), or the service answered it with the status 503 and a header `Retry-After`. After such an answer, the policy waits as long
/// as the service demands. An operation is not tried again when its deadline would pass during the wait. The operation
/// then ends at once with the failure of the last attempt.
///
/// In a negotiation, only the first leg is tried again, with a new handler. A policy with less than one attempt or with
/// a negative delay is refused with `Tarvel::InvalidArgumentException`.
struct RetryPolicy {
  int attempts = 1; ///< the maximum number of attempts, including the first; at least 1
  /// The delay before the second attempt. It doubles before each further attempt, and up to the half of it is
  /// subtracted at random.
  std::chrono::milliseconds firstDelay{200};
  std::chrono::milliseconds longestDelay{10'000}; ///< no delay is longer; a longer `Retry-After` ends the operation
};

/// Options of one call. Those that are not set are the client's.
struct CallOptions {
  /// The clock of deadlines, which no change of the system's time affects.
  using Clock = std::chrono::steady_clock;

  /// When the operation ends with `DeadlineExceededException` if it has not ended before. Without a deadline, only the time
  /// for each message is limited, to four minutes.
  boost::optional<Clock::time_point> deadline;

  /// What cancels the operation, which then ends with `CancelledException`.
  CancelToken cancelToken;

  /// Follows this operation in place of the client's observer; null for the client's.
  std::shared_ptr<OperationObserver> observer;

  /// The dialect in place of the client's.
  boost::optional<ServiceDialect> dialect;

  /// How the returned token is verified, in place of the client's options.
  boost::optional<VerifyOptions> verifyOptions;

  /// Where the callback runs, in place of the client's executor; empty for the client's. Calls that wait and
  /// futures do not use it.
  Executor executor;

  /// The policy in place of the client's.
  boost::optional<RetryPolicy> retryPolicy;

  /// Options with a deadline `timeout` from now, at most a hundred years. A negative time is a deadline that has passed.
  static CallOptions WithTimeout(std::chrono::milliseconds timeout) {
    constexpr std::chrono::milliseconds LONGEST = std::chrono::hours(24 * 365 * 100); // no addition overflows
    CallOptions options;
    options.deadline = Clock::now() + std::max(-LONGEST, std::min(timeout, LONGEST));
    return options;
  }
};

} // namespace SsoClient
