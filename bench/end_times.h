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

/// Cancels `samples` acquisitions one after the other. At each cancel, `underWay` acquisitions wait for the service.
/// @param server does not answer (`Hold`)
EndTimes MeasureCancel(const Testing::HeldServer &server, std::size_t underWay, std::size_t samples);

/// Starts `count` acquisitions, which all wait for the service. Then their deadlines pass, one each millisecond.
/// @param server does not answer (`Hold`)
EndTimes MeasureDeadline(const Testing::HeldServer &server, std::size_t count);

} // namespace Bench
