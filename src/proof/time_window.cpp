// SPDX-License-Identifier: Apache-2.0

#include "proof/time_window.h"

#include "token/token_checks.h"

#include <tarvel/core/exception.h>

#include <algorithm>
#include <limits>
#include <string>

namespace SsoClient {

namespace {

using Tarvel::System::DateTime;

void RequireNumber(bool isValid, const char *options, const char *name, const char *rule, std::int64_t number) {
  if (!isValid) {
    throw Tarvel::InvalidArgumentException(std::string(options) + "::" + name + " must " + rule + ", but is " +
                                           std::to_string(number));
  }
}

/// The age from which a message is refused, in seconds. Does not overflow, even if both numbers are the largest
/// possible.
std::int64_t LongestAge(const TimeWindow &window) noexcept {
  return window.maxAgeSec > std::numeric_limits<std::int64_t>::max() - window.clockToleranceSec
             ? std::numeric_limits<std::int64_t>::max()
             : window.maxAgeSec + window.clockToleranceSec;
}

} // namespace

void RequireTimeWindow(const TimeWindow &window, const char *options) {
  RequireNumber(window.clockToleranceSec >= 0, options, "clockToleranceSec", "not be negative",
                window.clockToleranceSec);
  RequireNumber(window.maxAgeSec > 0, options, "maxAgeSec", "be positive", window.maxAgeSec);
}

void CheckCreation(const DateTime &created, const TimeWindow &window, const DateTime &now, const Place &place,
                   DeviationSink &sink) {
  CheckStart({created, place, "The message was created in the future: "}, now, window.clockToleranceSec, sink);
  CheckEnd({created, place, "The message is too old. It was created at: "}, now, LongestAge(window), sink);
}

void CheckExpiry(const DateTime &expires, const TimeWindow &window, const DateTime &now, const Place &place,
                 DeviationSink &sink) {
  CheckEnd({expires, place, "The message has expired at: "}, now, window.clockToleranceSec, sink);
}

DateTime GetStaleTime(const DateTime &created, const boost::optional<DateTime> &expires,
                      const TimeWindow &window) noexcept {
  const DateTime tooOld = created.PlusSeconds(LongestAge(window));
  return expires ? std::min(tooOld, expires->PlusSeconds(window.clockToleranceSec)) : tooOld;
}

} // namespace SsoClient
