// SPDX-License-Identifier: Apache-2.0
/// @file
/// Numbers of microseconds: a second, and the lowest and the highest number that a function of DateTime accepts.

#pragma once

#include <cstdint>
#include <limits>

namespace Testing {

constexpr std::int64_t SECOND = 1'000'000;
constexpr std::int64_t LOWEST = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t HIGHEST = std::numeric_limits<std::int64_t>::max();

} // namespace Testing
