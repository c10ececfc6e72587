// SPDX-License-Identifier: Apache-2.0
/// @file
/// Whether and when a failed request is repeated.

#pragma once

#include "exchange/response_facts.h"

#include <ssoclient/client/call_options.h>

#include <boost/optional.hpp>

#include <chrono>
#include <string>

namespace SsoClient {

/// @throws Tarvel::InvalidArgumentException for less than one attempt, and for a negative delay.
void CheckRetryPolicy(const RetryPolicy &policy);

/// The time that a value of the header `Retry-After` demands. The value is a number of seconds or a date. 0 for a date
/// in the past, `boost::none` for any other value.
boost::optional<std::chrono::milliseconds> ReadRetryAfter(const std::string &value,
                                                          std::chrono::system_clock::time_point now);

/// How long to wait before a request that failed with a `CommunicationException` is repeated; `boost::none` when it is
/// not repeated. At most a year, even if the policy allows more.
/// @param attempt the number of the attempt that failed, from 1
/// @param facts those of its response
/// @param random from 0 to 1, for the jitter
boost::optional<std::chrono::milliseconds> GetRetryDelay(const RetryPolicy &policy, int attempt,
                                                         const ResponseFacts &facts,
                                                         std::chrono::system_clock::time_point now, double random);

} // namespace SsoClient
