// SPDX-License-Identifier: Apache-2.0
/// @file
/// `KeptContexts`, a pool of OpenSSL contexts for reuse.

#pragma once

#include "core/thread_shard.h"

#include <array>
#include <atomic>
#include <cstddef>

namespace Tarvel::Crypto {

/// A pool of contexts, because creating a context costs allocations and atomic operations on counters that all threads
/// share. A thread acquires a context, from its own shard if possible, uses it and returns it. No other thread uses it
/// until then. `Handle` is one of the owning handles; there are `KINDS` kinds of contexts, numbered from 0. Lock-free;
/// safe on any thread. The destructor frees nothing, so that a static object never calls OpenSSL after the end of
/// `main`.
template <typename Handle, std::size_t KINDS>
class KeptContexts {
public:
  constexpr KeptContexts() noexcept = default;
  KeptContexts(const KeptContexts &) = delete;
  KeptContexts &operator=(const KeptContexts &) = delete;

  /// A kept context of kind number `kind`; null if there is none.
  Handle Acquire(std::size_t kind) noexcept {
    for (std::size_t distance = 0; distance < SHARDS; ++distance) {
      Slot &slot = GetSlot(distance, kind);
      if (!slot.load(std::memory_order_relaxed)) {
        continue;
      }
      if (Pointer const context = slot.exchange(nullptr, std::memory_order_acquire)) {
        return Handle(context);
      }
    }
    return nullptr;
  }

  /// Keeps `context` for reuse, or frees it if enough are kept already.
  void Return(std::size_t kind, Handle context) noexcept {
    for (std::size_t distance = 0; distance < SHARDS; ++distance) {
      Pointer expected = nullptr;
      if (GetSlot(distance, kind)
              .compare_exchange_strong(expected, context.get(), std::memory_order_release, std::memory_order_relaxed)) {
        static_cast<void>(context.release()); // the slot owns it now
        return;
      }
    }
  }

  /// Frees all kept contexts. Only for the owner, while no other thread uses the object.
  void FreeAll() noexcept {
    for (Shard &shard : m_shards) {
      for (Slot &slot : shard.slots) {
        const Handle freed(slot.exchange(nullptr, std::memory_order_relaxed));
      }
    }
  }

private:
  static constexpr std::size_t SHARDS = 4; // if more threads use one kind at once, the rest create contexts

  using Pointer = typename Handle::pointer;
  using Slot = std::atomic<Pointer>;

  struct alignas(SHARD_ALIGNMENT) Shard {
    std::array<Slot, KINDS> slots{};
  };

  /// The slot that is `distance` shards after that of the calling thread.
  Slot &GetSlot(std::size_t distance, std::size_t kind) noexcept {
    return m_shards[(GetThreadShard(SHARDS) + distance) % SHARDS].slots[kind];
  }

  std::array<Shard, SHARDS> m_shards{};
};

} // namespace Tarvel::Crypto
