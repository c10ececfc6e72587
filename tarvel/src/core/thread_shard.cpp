// SPDX-License-Identifier: Apache-2.0

#include "core/thread_shard.h"

#include <atomic>

namespace Tarvel {

std::size_t GetThreadShard(std::size_t shards) noexcept {
  static std::atomic<std::size_t> threads{0};
  thread_local const std::size_t number = threads.fetch_add(1, std::memory_order_relaxed);
  return number % shards;
}

} // namespace Tarvel
