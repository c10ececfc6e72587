// SPDX-License-Identifier: Apache-2.0

#include "client/published_token.h"

#include <cstddef>
#include <utility>

namespace SsoClient {

namespace {

// A word has the address in its lower bits and the number of readers in its upper bits. An address has 48 bits on x86-64
// and aarch64, unless the program asks the system for higher ones. The lowest six are 0 because of the alignment, which
// leaves 22 bits for the number: as many threads as a Linux system can have.
constexpr int ALIGNMENT_BITS = 6;
constexpr std::size_t NODE_ALIGNMENT = std::size_t{1} << ALIGNMENT_BITS;
constexpr int ADDRESS_BITS = 48;
constexpr int COUNT_SHIFT = ADDRESS_BITS - ALIGNMENT_BITS;
constexpr std::uint64_t ONE_READER = std::uint64_t{1} << COUNT_SHIFT;
constexpr std::uint64_t ADDRESS_MASK = ONE_READER - 1;

static_assert(std::atomic<std::uint64_t>::is_always_lock_free, "readers would wait for each other");

} // namespace

struct alignas(NODE_ALIGNMENT) PublishedToken::Node {
  std::shared_ptr<const SamlToken> token;
  std::int64_t from = 0;
  std::atomic<std::int64_t> until{0};
  /// Readers that the writer has taken over from the word, minus those that have counted themselves out since.
  std::atomic<std::int64_t> readers{0};
};

/// 0 if the address has more bits, for example a tagged address. Readers then find nothing, as if no token were
/// published.
std::uint64_t PublishedToken::ToWord(const Node *node) noexcept {
  const std::uint64_t address = reinterpret_cast<std::uintptr_t>(node);
  return address >> ADDRESS_BITS == 0 ? address >> ALIGNMENT_BITS : 0;
}

PublishedToken::Node *PublishedToken::ToNode(std::uint64_t word) noexcept {
  // NOLINTNEXTLINE(performance-no-int-to-ptr): a pointer cannot share an atomic word with a count otherwise
  return reinterpret_cast<Node *>(static_cast<std::uintptr_t>((word & ADDRESS_MASK) << ALIGNMENT_BITS));
}

PublishedToken::~PublishedToken() {
  Clear();
}

std::shared_ptr<const SamlToken> PublishedToken::Read(std::int64_t now) const noexcept {
  if ((m_word.load(std::memory_order_relaxed) & ADDRESS_MASK) == 0) {
    return nullptr;
  }
  Node *const node = ToNode(m_word.fetch_add(ONE_READER, std::memory_order_acquire));
  std::shared_ptr<const SamlToken> token;
  if (node && now >= node->from && now < node->until.load(std::memory_order_relaxed)) {
    token = node->token;
  }
  CountOut(node);
  return token;
}

/// The node cannot be published again while this reader is counted, so the same address is the same publication.
void PublishedToken::CountOut(Node *node) const noexcept {
  const std::uint64_t address = ToWord(node);
  std::uint64_t word = m_word.load(std::memory_order_relaxed);
  while ((word & ADDRESS_MASK) == address && word >= ONE_READER) {
    if (m_word.compare_exchange_weak(word, word - ONE_READER, std::memory_order_release, std::memory_order_relaxed)) {
      return;
    }
  }
  // Replaced: the writer has taken over the count of the readers, or will do so.
  if (node && node->readers.fetch_sub(1, std::memory_order_acq_rel) == 1) {
    delete node;
  }
}

void PublishedToken::Publish(std::shared_ptr<const SamlToken> token, std::int64_t from, std::int64_t until) {
  auto *const node = new Node;
  node->token = std::move(token);
  node->from = from;
  node->until.store(until, std::memory_order_relaxed);
  Exchange(node);
}

void PublishedToken::SetUntil(std::int64_t until) noexcept {
  if (m_node) {
    m_node->until.store(until, std::memory_order_relaxed);
  }
}

void PublishedToken::Clear() noexcept {
  Exchange(nullptr);
}

void PublishedToken::Exchange(Node *node) noexcept {
  Node *const old = std::exchange(m_node, node);
  const std::uint64_t word = m_word.exchange(ToWord(node), std::memory_order_acq_rel);
  if (!old) {
    return;
  }
  // Readers that found nothing count themselves, too, but not for the node.
  const auto readers = (word & ADDRESS_MASK) != 0 ? static_cast<std::int64_t>(word >> COUNT_SHIFT) : 0;
  if (old->readers.fetch_add(readers, std::memory_order_acq_rel) == -readers) {
    delete old;
  }
}

} // namespace SsoClient
