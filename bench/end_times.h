// SPDX-License-Identifier: Apache-2.0
/// @file
/// How soon an acquisition ends after it was cancelled, or after its deadline.

#pragma once

#include "support/held_server.h"

#include <cstddef>

namespace Bench {

/// Milliseconds until the callback.
struct EndTimes {
  double median = 0;
  double worst = 0;
};

/// Cancels `samples` acquisitions one after the other, each among `underWay` that wait for the service.
/// @param server holds its answers
EndTimes MeasureCancel(const Testing::HeldServer &server, std::size_t underWay, std::size_t samples);

/// Starts `count` acquisitions whose deadlines pass one after the other, each a millisecond after the one before, while
/// all wait for the service.
/// @param server holds its answers
EndTimes MeasureDeadline(const Testing::HeldServer &server, std::size_t count);

} // namespace Bench
