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

/// Identifiers, each with the time until which it is remembered. For one thread at a time. Times are microseconds since 1970,
/// UTC.
///
/// It is a hash table with linear probing. Its slots are in the order of the tags, with displaced ones after their place, so
/// one sweep over the slots finds everything that has expired. Each call sweeps `SWEPT_SLOTS` of them and closes the gaps. So
/// no call takes long, and there is always a place for a new identifier while at most four fifths of the capacity have not
/// expired. Proof: in the calls of one round over all slots, D identifiers are removed and at most R = (slots + D) / SWEPT_SLOTS
/// are added. If D is at least slots / (SWEPT_SLOTS - 1), there are not more identifiers than before. Otherwise R is at most
/// slots / (SWEPT_SLOTS - 1), and what remains are these and identifiers that have not expired in the round: with 5/4 slots
/// for each, less than 4/5 + 1/5 of the capacity.
class RememberedMessages {
public:
  /// Finds an identifier in a table.
  struct Place {
    std::uint32_t tag = 0; ///< never 0
    std::size_t slot = 0;  ///< where the search begins
  };

  /// An empty table, with all memory that it will ever use.
  /// @param capacity positive; at most `MAX_MEMORY_REPLAY_GUARD_CAPACITY`
  /// @throws std::bad_alloc
  RememberedMessages(std::size_t capacity, const SipHashKey &key);

  /// Computes the place of `identifier`, and makes the processor fetch its memory. Uses nothing that changes: any thread may
  /// call it at any time.
  Place Prepare(const MessageIdentifier &identifier) const noexcept;

  /// Remembers the identifier, whose place is `place`, if it is not known.
  ReplayGuard::Answer Remember(const Place &place, const MessageIdentifier &identifier, std::int64_t until,
                               std::int64_t now) noexcept;

private:
  static constexpr std::size_t SWEPT_SLOTS = 8;

  std::size_t SlotOf(std::uint32_t tag) const noexcept;
  std::size_t After(std::size_t slot) const noexcept { return slot + 1 == m_tags.size() ? 0 : slot + 1; }
  std::size_t Distance(std::size_t from, std::size_t to) const noexcept;
  void Sweep(std::int64_t now) noexcept;
  void Remove(std::size_t slot) noexcept;

  const std::size_t m_capacity;
  const SipHashKey m_key;
  // One element for each slot. The arrays are separate so that a search touches little memory.
  template <typename T>
  using Array = std::vector<T, LargePageAllocator<T>>;
  Array<std::uint32_t> m_tags; // 0 in an empty slot
  Array<std::int64_t> m_untils;
  Array<MessageIdentifier> m_identifiers;
  std::size_t m_count = 0;
  std::size_t m_sweep = 0; // the slot at which the next sweep begins
  // The latest end of a time for which an identifier that was removed was remembered. It can be in the
  // future only after the clock was set back.
  std::int64_t m_forgottenUntil = std::numeric_limits<std::int64_t>::min();
};

} // namespace SsoClient
