// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TimeWindow`, the time in which a message is accepted.

#pragma once

#include "xml/deviation_sink.h"
#include "xml/refuse.h"

#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>

#include <cstdint>

namespace SsoClient {

/// The time in which a message is accepted, in seconds.
struct TimeWindow {
  std::int64_t clockToleranceSec; ///< how far the clocks of sender and receiver may differ
  std::int64_t maxAgeSec;         ///< how long ago the message may have been created, in addition to the tolerance
};

/// @param options the name of the type that has the numbers, for the message
/// @throws Tarvel::InvalidArgumentException when the tolerance is negative, or the age is not positive.
void RequireTimeWindow(const TimeWindow &window, const char *options);

/// Checks that a message that was created at `created` is neither from the future nor too old.
/// @param place where the date is written, for a report
/// @param sink throws `StaleMessageException` in a verification
void CheckCreation(const Tarvel::System::DateTime &created, const TimeWindow &window,
                   const Tarvel::System::DateTime &now, const Place &place, DeviationSink &sink);

/// Checks that `now` is before `expires` plus the tolerance. The other parameters are those of `CheckCreation`.
void CheckExpiry(const Tarvel::System::DateTime &expires, const TimeWindow &window, const Tarvel::System::DateTime &now,
                 const Place &place, DeviationSink &sink);

/// The first moment at which `CheckCreation` or `CheckExpiry` refuses a message that both accept now.
Tarvel::System::DateTime GetStaleTime(const Tarvel::System::DateTime &created,
                                      const boost::optional<Tarvel::System::DateTime> &expires,
                                      const TimeWindow &window) noexcept;

} // namespace SsoClient
