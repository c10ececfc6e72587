// SPDX-License-Identifier: Apache-2.0
/// @file
/// How long a step of `ssoclient doctor` may take.

#pragma once

#include <boost/optional.hpp>

#include <chrono>

namespace SsoClient::Tool {

/// How long a step that begins now may take, at least a millisecond. A step that hangs must end before --timeout ends
/// the command, so that the results of the other steps are shown.
/// @param limit of --timeout; `boost::none` for no limit
/// @param left how much of it is left; ignored without a limit
std::chrono::microseconds StepLimit(const boost::optional<std::chrono::microseconds> &limit,
                                    std::chrono::microseconds left);

} // namespace SsoClient::Tool
