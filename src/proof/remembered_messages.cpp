// SPDX-License-Identifier: Apache-2.0

#include "proof/remembered_messages.h"

#include <algorithm>

namespace SsoClient {

namespace {

constexpr int TAG_BITS = 32;

// One third of the slots of a full table is empty, so that linear probing stays fast. The two further slots keep a slot
// empty in the smallest tables, too, so that each search ends.
std::size_t CountSlots(std::size_t capacity) {
  return capacity + capacity / 2 + 2;
}

} // namespace

RememberedMessages::RememberedMessages(std::size_t capacity, const SipHashKey &key)
    : m_capacity(capacity), m_key(key), m_tags(CountSlots(capacity)), m_rests(m_tags.size()) {}

RememberedMessages::Place RememberedMessages::Prepare(const MessageIdentifier &identifier) const noexcept {
  const SipHash hash = ComputeSipHash(m_key, identifier);
  const auto tag = std::max(static_cast<std::uint32_t>(hash.first >> TAG_BITS), std::uint32_t{1});
  const Place place{tag, hash.second, SlotOf(tag)};
  __builtin_prefetch(&m_tags[place.slot], 1);
  __builtin_prefetch(&m_rests[place.slot], 1);
  return place;
}

ReplayGuard::Answer RememberedMessages::Remember(const Place &place, std::int64_t until, std::int64_t now) noexcept {
  Sweep(now);
  std::size_t slot = place.slot;
  for (; m_tags[slot] != 0; slot = After(slot)) {
    if (m_tags[slot] == place.tag && m_rests[slot].check == place.check) {
      return ReplayGuard::Answer::REPEATED;
    }
  }
  // An unknown identifier with an `until` that is not later than these times may have been known and removed.
  if (until <= std::max(now, m_forgottenUntil) || m_count == m_capacity) {
    return ReplayGuard::Answer::UNAVAILABLE;
  }
  m_tags[slot] = place.tag;
  m_rests[slot] = {until, place.check};
  ++m_count;
  return ReplayGuard::Answer::FIRST;
}

std::size_t RememberedMessages::SlotOf(std::uint32_t tag) const noexcept {
  return static_cast<std::size_t>((std::uint64_t{tag} * m_tags.size()) >> TAG_BITS);
}

// How many slots after `from` the slot `to` is; the first slot is after the last one.
std::size_t RememberedMessages::Distance(std::size_t from, std::size_t to) const noexcept {
  return to >= from ? to - from : to + m_tags.size() - from;
}

void RememberedMessages::Sweep(std::int64_t now) noexcept {
  for (std::size_t i = 0; i < SWEPT_SLOTS; ++i) {
    if (m_tags[m_sweep] != 0 && m_rests[m_sweep].until <= now) {
      Remove(m_sweep); // what was moved here, if anything, is examined next
    } else {
      m_sweep = After(m_sweep);
    }
  }
}

// Closes the gap: a search ends at an empty slot, so a later identifier that belongs at or before the gap is moved
// into it.
void RememberedMessages::Remove(std::size_t slot) noexcept {
  m_forgottenUntil = std::max(m_forgottenUntil, m_rests[slot].until);
  std::size_t gap = slot;
  for (std::size_t next = After(gap); m_tags[next] != 0; next = After(next)) {
    if (Distance(SlotOf(m_tags[next]), next) >= Distance(gap, next)) {
      m_tags[gap] = m_tags[next];
      m_rests[gap] = m_rests[next];
      gap = next;
    }
  }
  m_tags[gap] = 0;
  --m_count;
}

} // namespace SsoClient
