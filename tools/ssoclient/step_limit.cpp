// SPDX-License-Identifier: Apache-2.0

#include "step_limit.h"

#include <algorithm>

namespace SsoClient::Tool {
namespace {

using std::chrono::microseconds;

/// Without --timeout.
constexpr microseconds DEFAULT_STEP = std::chrono::seconds(10);
constexpr microseconds SHORTEST_STEP = std::chrono::milliseconds(1);
/// How much of the time of --timeout is kept to show the results; at most half of it.
constexpr microseconds TIME_TO_SHOW = std::chrono::milliseconds(500);

} // namespace

microseconds StepLimit(const boost::optional<microseconds> &limit, microseconds left) {
  return limit ? std::max(left - std::min(*limit / 2, TIME_TO_SHOW), SHORTEST_STEP) : DEFAULT_STEP;
}

} // namespace SsoClient::Tool
