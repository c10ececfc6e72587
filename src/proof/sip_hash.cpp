// SPDX-License-Identifier: Apache-2.0

#include "proof/sip_hash.h"

#include <bit>
#include <cstddef>

namespace SsoClient {

namespace {

constexpr std::size_t WORD_BYTES = 8;
constexpr int BITS_PER_BYTE = 8;

// The hash of 128 bits differs from that of 64 by these numbers.
constexpr std::uint64_t LONG_HASH_MARK = 0xee;
constexpr std::uint64_t SECOND_HALF_MARK = 0xdd;

// The four words of state, and the numbers with which they begin: "somepseudorandomlygeneratedbytes".
struct State {
  std::uint64_t v0 = 0x736f6d6570736575;
  std::uint64_t v1 = 0x646f72616e646f6d;
  std::uint64_t v2 = 0x6c7967656e657261;
  std::uint64_t v3 = 0x7465646279746573;

  explicit State(const SipHashKey &key) noexcept {
    v0 ^= key.low;
    v1 ^= key.high ^ LONG_HASH_MARK;
    v2 ^= key.low;
    v3 ^= key.high;
  }

  // The paper's SipRound. The numbers of bits are those of the paper.
  void Round() noexcept {
    v0 += v1;
    v2 += v3;
    v1 = std::rotl(v1, 13) ^ v0;
    v3 = std::rotl(v3, 16) ^ v2;
    v0 = std::rotl(v0, 32) + v3;
    v2 += v1;
    v1 = std::rotl(v1, 17) ^ v2;
    v3 = std::rotl(v3, 21) ^ v0;
    v2 = std::rotl(v2, 32);
  }

  void Add(std::uint64_t word) noexcept {
    v3 ^= word;
    Round();
    Round();
    v0 ^= word;
  }

  std::uint64_t Finish() noexcept {
    for (int i = 0; i < 4; ++i) {
      Round();
    }
    return v0 ^ v1 ^ v2 ^ v3;
  }
};

std::uint64_t ReadWord(const std::uint8_t *bytes) noexcept {
  std::uint64_t word = 0;
  for (std::size_t i = WORD_BYTES; i > 0; --i) {
    word = word << BITS_PER_BYTE | bytes[i - 1];
  }
  return word;
}

} // namespace

SipHash ComputeSipHash(const SipHashKey &key, const MessageIdentifier &identifier) noexcept {
  constexpr int LENGTH_SHIFT = 56; // the last word has the length in its last octet, and here nothing else
  State state(key);
  for (std::size_t i = 0; i < identifier.size(); i += WORD_BYTES) {
    state.Add(ReadWord(identifier.data() + i));
  }
  state.Add(static_cast<std::uint64_t>(identifier.size()) << LENGTH_SHIFT);
  state.v2 ^= LONG_HASH_MARK;
  SipHash hash;
  hash.first = state.Finish();
  state.v1 ^= SECOND_HALF_MARK;
  hash.second = state.Finish();
  return hash;
}

} // namespace SsoClient
