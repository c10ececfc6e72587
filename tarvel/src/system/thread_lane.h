// SPDX-License-Identifier: Apache-2.0
/// @file
/// Lanes: which part of something that is split among threads, so that they do not get in each other's way, is for whom.

#pragma once

#include <cstddef>

namespace Tarvel::System {

/// Far enough apart for two processors never to share a line of their caches.
constexpr std::size_t LANE_ALIGNMENT = 64;

/// The calling thread's lane, one of `lanes`. Always the same for one thread; threads take lanes in turn.
std::size_t GetThreadLane(std::size_t lanes) noexcept;

} // namespace Tarvel::System
