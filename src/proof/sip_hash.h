// SPDX-License-Identifier: Apache-2.0
/// @file
/// SipHash-2-4 of identifiers (Aumasson and Bernstein, "SipHash: a fast short-input PRF", 2012).

#pragma once

#include <ssoclient/proof/replay_guard.h>

#include <cstdint>

namespace SsoClient {

/// A key of SipHash: its octets 0 to 7 and 8 to 15, each as a little-endian number.
struct SipHashKey {
  std::uint64_t low = 0;
  std::uint64_t high = 0;
};

/// The first and the last eight octets of a hash, each as a little-endian number.
struct SipHash {
  std::uint64_t first = 0;
  std::uint64_t second = 0;
};

/// SipHash-2-4 of the 32 octets, with 128 bits. Without the key, the values cannot be predicted, so a sender cannot
/// choose identifiers with equal or similar values.
SipHash ComputeSipHash(const SipHashKey &key, const MessageIdentifier &identifier) noexcept;

} // namespace SsoClient
