// SPDX-License-Identifier: Apache-2.0

#include "xml/node_arena.h"

#include <tarvel/core/secure_wipe.h>

#include <algorithm>
#include <cstring>

namespace Tarvel::Xml {

namespace {

constexpr std::size_t SMALLEST_BLOCK_BYTES = 1024;
constexpr std::size_t LARGEST_BLOCK_BYTES = 64 * 1024;

constexpr std::size_t RoundUp(std::size_t size, std::size_t alignment) noexcept {
  return (size + alignment - 1) / alignment * alignment;
}

} // namespace

// The arena and its first memory are one allocation, so a single node costs only one allocation.
NodeArena *NodeArena::Create(std::size_t firstBytes, AfterUse afterUse) {
  const std::size_t capacity = RoundUp(firstBytes, ALIGNMENT);
  return new (::operator new(sizeof(NodeArena) + capacity)) NodeArena(capacity, afterUse);
}

NodeArena::NodeArena(std::size_t firstBytes, AfterUse afterUse) noexcept
    : m_free(reinterpret_cast<char *>(this) + sizeof(NodeArena)), m_end(m_free + firstBytes),
      m_nextBlockBytes(std::clamp(firstBytes, SMALLEST_BLOCK_BYTES, LARGEST_BLOCK_BYTES)), m_firstBytes(firstBytes),
      m_afterUse(afterUse) {}

NodeArena::~NodeArena() {
  if (m_afterUse == AfterUse::WIPE_AND_FREE) {
    SecureWipe(reinterpret_cast<char *>(this) + sizeof(NodeArena), m_firstBytes);
    for (Block *block = m_blocks; block; block = block->next) {
      SecureWipe(block + 1, block->bytes);
    }
  }
  while (m_blocks) {
    ::operator delete(std::exchange(m_blocks, m_blocks->next));
  }
}

void NodeArena::Release() noexcept {
  NodeArena *const leader = GetLeader();
  if (leader->m_references.fetch_sub(1, std::memory_order_acq_rel) == 1) {
    leader->FreeAll();
  }
}

void NodeArena::FreeAll() noexcept {
  NodeArena *arena = this;
  while (arena) {
    NodeArena *const next = arena->m_nextInGroup;
    arena->~NodeArena();
    ::operator delete(arena);
    arena = next;
  }
}

void NodeArena::Join(NodeArena *a, NodeArena *b) noexcept {
  NodeArena *larger = a->GetLeader();
  NodeArena *smaller = b->GetLeader();
  if (larger == smaller) {
    return;
  }
  if (larger->m_groupSize < smaller->m_groupSize) {
    std::swap(larger, smaller);
  }
  larger->m_references.fetch_add(smaller->m_references.load(std::memory_order_relaxed), std::memory_order_relaxed);
  larger->m_groupSize += smaller->m_groupSize;
  larger->m_lastInGroup->m_nextInGroup = smaller;
  larger->m_lastInGroup = smaller->m_lastInGroup;
  smaller->m_leader = larger;
}

void *NodeArena::AllocateInNewBlock(std::size_t size) {
  AddBlock(size);
  return std::exchange(m_free, m_free + size);
}

std::string_view NodeArena::Copy(std::string_view text) {
  if (text.empty()) {
    return std::string_view();
  }
  char *const copy = AllocateText(text.size());
  std::memcpy(copy, text.data(), text.size());
  return std::string_view(copy, text.size());
}

std::string_view NodeArena::CopyQualifiedName(std::string_view prefix, std::string_view localName) {
  if (prefix.empty()) {
    return Copy(localName);
  }
  const std::size_t size = prefix.size() + 1 + localName.size();
  char *const name = AllocateText(size);
  std::memcpy(name, prefix.data(), prefix.size());
  name[prefix.size()] = ':';
  std::memcpy(name + prefix.size() + 1, localName.data(), localName.size());
  return std::string_view(name, size);
}

char *NodeArena::AllocateText(std::size_t size) {
  if (size >= LARGEST_BLOCK_BYTES / 4) { // a block of its own, so that the rest of the current one is not lost
    return AllocateBlock(size);
  }
  if (static_cast<std::size_t>(m_end - m_free) < size) {
    AddBlock(size);
  }
  return std::exchange(m_free, m_free + size);
}

void NodeArena::AddBlock(std::size_t size) {
  const std::size_t capacity = std::max(size, m_nextBlockBytes);
  m_free = AllocateBlock(capacity);
  m_end = m_free + capacity;
  m_nextBlockBytes = std::min(2 * m_nextBlockBytes, LARGEST_BLOCK_BYTES);
}

char *NodeArena::AllocateBlock(std::size_t size) {
  Block *const block = static_cast<Block *>(::operator new(sizeof(Block) + size));
  block->next = m_blocks;
  block->bytes = size;
  m_blocks = block;
  return reinterpret_cast<char *>(block + 1);
}

} // namespace Tarvel::Xml
