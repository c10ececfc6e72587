// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RememberedMessages`, the table of the replay guard in memory.

#pragma once

#include "proof/large_page_allocator.h"
#include "proof/sip_hash.h"

#include <ssoclient/proof/replay_guard.h>

#include <cstddef>
#include <cstdint>
#include <limits>
#include <vector>

namespace SsoClient {

/// Identifiers, each with the time until which it is remembered. For one thread at a time. Times are microseconds
/// since 1970, UTC.
///
/// Of an identifier, the table contains 96 bits of a hash with a secret key. So it always finds an identifier that it
/// contains. Among a million, it confuses another one with one of them with a probability of 2 to the power of -76, which
/// no sender can increase.
///
/// It is a hash table with linear probing: an identifier is in the slot that its tag decides, or after it if that slot
/// was not empty. Each call of `Remember` first sweeps: it takes `SWEPT_SLOTS` steps, so no call takes long. A step
/// examines one slot, and removes its identifier if it has expired. A removal closes the gap, and moves no identifier
/// to a slot before the one that is examined next, so one round over all slots finds everything that has expired.
///
/// There is always a place for a new identifier while at most four fifths of the capacity have not expired. Proof: a
/// round that removes D identifiers takes slots + D steps, so it has at most A = (slots + D) / SWEPT_SLOTS calls, which
/// add at most A identifiers. If D is at least slots / (SWEPT_SLOTS - 1), then A is at most D, and there are not more
/// identifiers than before the round. Otherwise A is less than slots / (SWEPT_SLOTS - 1), which is less than a fifth of
/// the capacity, because there are 3/2 slots for each identifier. After such a round, the table contains only these and
/// identifiers that have not expired in the round: less than 1/5 + 4/5 of the capacity. The two further slots matter
/// for capacities up to 20 only: a test of each of them shows the same.
class RememberedMessages {
public:
  /// What the table contains of an identifier, and where the search for it begins.
  struct Place {
    std::uint32_t tag = 0;   ///< never 0
    std::uint64_t check = 0; ///< the other half of the hash
    std::size_t slot = 0;    ///< the first slot of the search
  };

  /// An empty table, with all memory that it will ever use.
  /// @param capacity positive; at most `MAX_MEMORY_REPLAY_GUARD_CAPACITY`
  /// @throws std::bad_alloc
  RememberedMessages(std::size_t capacity, const SipHashKey &key);

  /// Computes the place of `identifier`, and makes the processor fetch its memory. Uses nothing that changes: any
  /// thread may call it at any time.
  Place Prepare(const MessageIdentifier &identifier) const noexcept;

  /// Remembers the identifier, whose place is `place`, if it is not known.
  ReplayGuard::Answer Remember(const Place &place, std::int64_t until, std::int64_t now) noexcept;

private:
  static constexpr std::size_t SWEPT_SLOTS = 9;

  std::size_t SlotOf(std::uint32_t tag) const noexcept;
  std::size_t After(std::size_t slot) const noexcept { return slot + 1 == m_tags.size() ? 0 : slot + 1; }
  std::size_t Distance(std::size_t from, std::size_t to) const noexcept;
  void Sweep(std::int64_t now) noexcept;
  void Remove(std::size_t slot) noexcept;

  const std::size_t m_capacity;
  const SipHashKey m_key;
  // One element for each slot. The arrays are separate so that a search touches little memory.
  struct Rest {
    std::int64_t until = 0;
    std::uint64_t check = 0;
  };
  template <typename T>
  using Array = std::vector<T, LargePageAllocator<T>>;
  Array<std::uint32_t> m_tags; // 0 in an empty slot
  Array<Rest> m_rests;
  std::size_t m_count = 0;
  std::size_t m_sweep = 0; // the slot at which the next sweep begins
  // The latest `until` of all identifiers that were removed. It is in the future only after the clock was set back.
  std::int64_t m_forgottenUntil = std::numeric_limits<std::int64_t>::min();
};

} // namespace SsoClient
