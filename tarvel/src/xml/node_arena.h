// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NodeArena`, the memory of the nodes of a tree.

#pragma once

#include <tarvel/core/ref.h>

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <new>
#include <string_view>
#include <type_traits>
#include <utility>

namespace Tarvel::Xml {

/// Memory that grows and is freed as a whole. Nodes need no destruction, so freeing a tree takes a few calls, however large
/// or deep it is.
///
/// When a tree is appended to another, their arenas are joined: from then on they share one reference count and are freed
/// together. So both trees live as long as any reference to either, and no cycle of owners can arise. Joining needs exclusive
/// access to both trees; counting references does not.
class NodeArena {
public:
  enum class AfterUse : std::uint8_t { FREE, WIPE_AND_FREE };

  /// An arena without references. The caller adds the first one by creating a `Ref` to the first node.
  /// @param firstBytes the memory to allocate with the arena.
  /// @param afterUse whether the memory is overwritten before it is freed, because it may contain secrets.
  static NodeArena *Create(std::size_t firstBytes, AfterUse afterUse = AfterUse::FREE);

  NodeArena(const NodeArena &) = delete;
  NodeArena &operator=(const NodeArena &) = delete;

  void AddRef() noexcept { GetLeader()->m_references.fetch_add(1, std::memory_order_relaxed); }
  void Release() noexcept;

  /// A new node or attribute, in this arena's memory.
  template <typename T, typename... Args>
  T *New(Args &&...args) {
    static_assert(std::is_trivially_destructible_v<T>, "nothing in an arena is ever destroyed");
    static_assert(alignof(T) <= ALIGNMENT);
    return new (Allocate(sizeof(T))) T(std::forward<Args>(args)...);
  }

  /// A copy of `text` in this arena's memory.
  std::string_view Copy(std::string_view text);

  /// A copy of the name as written: the local name, after prefix and colon where there is a prefix.
  std::string_view CopyQualifiedName(std::string_view prefix, std::string_view localName);

  /// Makes the arena overwrite its memory before it is freed.
  void WipeAfterUse() noexcept { m_afterUse = AfterUse::WIPE_AND_FREE; }

  /// Keeps `object`, which views of this arena's nodes point into, for as long as the arena lives.
  void Keep(const Ref<Object> &object) { m_kept = object; }

  static bool AreJoined(const NodeArena *a, const NodeArena *b) noexcept { return a->GetLeader() == b->GetLeader(); }

  /// Joins the arenas of `a` and of `b`; nothing happens when they are joined already.
  static void Join(NodeArena *a, NodeArena *b) noexcept;

private:
  static constexpr std::size_t ALIGNMENT = alignof(void *);

  struct Block {
    Block *next;
    std::size_t bytes; // after this header
  };

  NodeArena(std::size_t firstBytes, AfterUse afterUse) noexcept;
  ~NodeArena();

  void *Allocate(std::size_t size) {
    char *const begin = m_free + (-reinterpret_cast<std::uintptr_t>(m_free) & (ALIGNMENT - 1));
    if (begin > m_end || static_cast<std::size_t>(m_end - begin) < size) {
      return AllocateInNewBlock(size);
    }
    m_free = begin + size;
    return begin;
  }
  void *AllocateInNewBlock(std::size_t size);
  char *AllocateText(std::size_t size);
  void AddBlock(std::size_t size);
  char *AllocateBlock(std::size_t size);
  void FreeAll() noexcept;

  /// The arena that has the reference count of all arenas joined with this one. Joining always puts the smaller group below
  /// the larger, so the path to the leader is at most logarithmic in the number of arenas, and readers need not shorten
  /// it.
  NodeArena *GetLeader() noexcept {
    NodeArena *arena = this;
    while (arena->m_leader) {
      arena = arena->m_leader;
    }
    return arena;
  }
  const NodeArena *GetLeader() const noexcept { return const_cast<NodeArena *>(this)->GetLeader(); }

  std::atomic<std::uint32_t> m_references{0}; // of a leader: the references to all arenas of its group
  std::uint32_t m_groupSize = 1;
  NodeArena *m_leader = nullptr;
  NodeArena *m_nextInGroup = nullptr;
  NodeArena *m_lastInGroup = this; // only used for a leader
  char *m_free;
  char *m_end;
  Block *m_blocks = nullptr;
  std::size_t m_nextBlockBytes;
  std::size_t m_firstBytes;
  AfterUse m_afterUse;
  Ref<Object> m_kept;
};

} // namespace Tarvel::Xml
