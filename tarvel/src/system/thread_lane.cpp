// SPDX-License-Identifier: Apache-2.0

#include "system/thread_lane.h"

#include <atomic>

namespace Tarvel::System {

std::size_t GetThreadLane(std::size_t lanes) noexcept {
  static std::atomic<std::size_t> threads{0};
  thread_local const std::size_t number = threads.fetch_add(1, std::memory_order_relaxed);
  return number % lanes;
}

} // namespace Tarvel::System
