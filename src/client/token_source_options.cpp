// SPDX-License-Identifier: Apache-2.0

#include "client/token_source_options.h"

#include <tarvel/core/exception.h>

namespace SsoClient {

namespace {

// Tokens that are refreshed earlier would cause too many requests.
constexpr double EARLIEST_REFRESH = 0.1;
constexpr double LATEST_REFRESH = 0.99;

// A longer time would overflow when it is doubled or added to another one.
constexpr std::chrono::hours LONGEST_TIME{24 * 365};

void Check(bool isValid, const char *rule) {
  if (!isValid) {
    throw Tarvel::InvalidArgumentException(rule);
  }
}

} // namespace

// A comparison with "not a number" is false, so each range is written as what is valid.
void CheckTokenSource(bool hasClient, const CredentialProvider &provider, const TokenSpec &spec,
                      const TokenSourceOptions &options) {
  Check(hasClient, "the client of a TokenSource is null");
  Check(provider != nullptr, "the credential provider of a TokenSource is empty");
  Check(spec.tokenLifetimeSec > 0, "TokenSpec::tokenLifetimeSec must be positive");
  Check(options.refreshAt >= EARLIEST_REFRESH && options.refreshAt <= LATEST_REFRESH,
        "TokenSourceOptions::refreshAt must be between 0.1 and 0.99");
  Check(options.jitter >= 0 && options.jitter <= options.refreshAt / 2,
        "TokenSourceOptions::jitter must be between 0 and the half of refreshAt");
  Check(options.expiryMargin.count() >= 0 && options.expiryMargin <= LONGEST_TIME,
        "TokenSourceOptions::expiryMargin must be between 0 and a year");
  Check(options.firstBackOff.count() > 0 && options.firstBackOff <= options.longestBackOff,
        "TokenSourceOptions::firstBackOff must be positive and at most longestBackOff");
  Check(options.longestBackOff <= LONGEST_TIME, "TokenSourceOptions::longestBackOff must be at most a year");
  Check(options.attemptTimeout.count() > 0 && options.attemptTimeout <= LONGEST_TIME,
        "TokenSourceOptions::attemptTimeout must be positive and at most a year");
  Check(!options.cache || !options.cache->path.empty(), "TokenCacheOptions::path must not be empty");
}

} // namespace SsoClient
