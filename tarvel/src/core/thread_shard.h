// SPDX-License-Identifier: Apache-2.0
/// @file
/// Assigns each thread a shard: an index into data that is split up, so that threads do not contend for it.

#pragma once

#include <cstddef>

namespace Tarvel {

/// Alignment at which two shards never share a cache line.
constexpr std::size_t SHARD_ALIGNMENT = 64;

/// The calling thread's shard: an index below `shards`, always the same for one thread. Consecutive threads get consecutive
/// shards.
std::size_t GetThreadShard(std::size_t shards) noexcept;

} // namespace Tarvel
