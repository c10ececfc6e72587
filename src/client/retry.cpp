// SPDX-License-Identifier: Apache-2.0

#include "client/retry.h"

#include <tarvel/core/exception.h>
#include <tarvel/http/http_date.h>
#include <tarvel/system/date_time.h>

#include <algorithm>
#include <cstdint>

namespace SsoClient {

namespace {

using std::chrono::milliseconds;

constexpr int SERVICE_UNAVAILABLE = 503;
/// A number with more digits is longer than any wait: it means "never".
constexpr std::size_t MAX_DIGITS = 9;
/// No delay is longer, even if the policy allows more, so that no sum of two overflows.
constexpr milliseconds LONGEST_DELAY = std::chrono::hours(24 * 365);

bool IsDigit(char c) noexcept {
  return c >= '0' && c <= '9';
}

/// The delay before attempt `attempt` + 1, without jitter.
milliseconds GetBackOff(milliseconds first, milliseconds longest, int attempt) {
  milliseconds delay = std::min(first, longest);
  for (int doubled = 1; doubled < attempt && delay.count() > 0 && delay < longest; ++doubled) {
    delay = delay > longest / 2 ? longest : delay * 2;
  }
  return delay;
}

/// Whether no connection was made, so that the service has not received the request.
bool IsUnsent(const ResponseFacts &facts) noexcept {
  return facts.status == 0 && !facts.hasConnected;
}

/// Between a half of `delay` and all of it, so that many programs do not try again at once.
milliseconds WithJitter(milliseconds delay, double random) {
  return milliseconds(static_cast<std::int64_t>(static_cast<double>(delay.count()) * (1.0 + random) / 2.0));
}

} // namespace

void CheckRetryPolicy(const RetryPolicy &policy) {
  if (policy.attempts < 1) {
    throw Tarvel::InvalidArgumentException("RetryPolicy::attempts must be at least 1");
  }
  if (policy.firstDelay.count() < 0 || policy.longestDelay.count() < 0) {
    throw Tarvel::InvalidArgumentException("RetryPolicy: a delay may not be negative");
  }
}

boost::optional<milliseconds> ReadRetryAfter(const std::string &value, std::chrono::system_clock::time_point now) {
  if (!value.empty() && std::all_of(value.begin(), value.end(), IsDigit)) {
    return value.size() > MAX_DIGITS ? milliseconds::max() : milliseconds(std::chrono::seconds(std::stoll(value)));
  }
  const boost::optional<Tarvel::System::DateTime> date = Tarvel::Http::ParseHttpDate(value);
  if (!date) {
    return boost::none;
  }
  const std::int64_t wait = date->MicrosecondsSince(Tarvel::System::DateTime::FromTimePoint(now));
  // Rounded up: never before the date.
  return milliseconds(std::max<std::int64_t>((wait + 999) / 1000, 0));
}

boost::optional<milliseconds> GetRetryDelay(const RetryPolicy &policy, int attempt, const ResponseFacts &facts,
                                            std::chrono::system_clock::time_point now, double random) {
  if (attempt >= policy.attempts) {
    return boost::none;
  }
  const milliseconds longest = std::min(policy.longestDelay, LONGEST_DELAY);
  const milliseconds backOff = WithJitter(GetBackOff(policy.firstDelay, longest, attempt), random);
  if (IsUnsent(facts)) {
    return backOff;
  }
  if (facts.status != SERVICE_UNAVAILABLE) {
    return boost::none;
  }
  const boost::optional<milliseconds> demanded = ReadRetryAfter(facts.retryAfter, now);
  if (!demanded || *demanded > longest) {
    return boost::none;
  }
  // The delay with jitter is added to the time that the service demands, so no request is sent before that time.
  return std::min(*demanded + backOff, longest);
}

} // namespace SsoClient
