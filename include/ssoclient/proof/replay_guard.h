// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ReplayGuard`, which remembers the messages that a service has accepted, so that no message is accepted twice.

#pragma once

#include <ssoclient/export.h>
#include <tarvel/system/date_time.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>

namespace SsoClient {

/// Identifies a signed message: SHA-256 over what was signed, in canonical form, and over the thumbprint of the key.
/// The signature's value is not part of it, because some algorithms have several valid values for one message. Not
/// secret.
using MessageIdentifier = std::array<std::uint8_t, 32>;

/// Remembers messages. An implementation may be called on any number of threads at once.
class SSOCLIENT_API ReplayGuard {
public:
  /// The answer to a message.
  enum class Answer : std::int32_t {
    FIRST = 0,  ///< it was not known, and is remembered now
    REPEATED,   ///< it is known
    UNAVAILABLE ///< the guard is full or cannot be reached; the message is not remembered
  };

  /// Remembers the message, at least until `until`, and answers whether it was known. Both happen in one step: of
  /// several calls with one identifier at the same time, at most one is answered FIRST. The function may block, for
  /// example on the network. If it throws, the message is refused by a `ReplayGuardException`, like after
  /// UNAVAILABLE. If it returns FIRST at `until` or later, when it may have forgotten the message, the message is
  /// refused by a `StaleMessageException`.
  virtual Answer Remember(const MessageIdentifier &identifier, const Tarvel::System::DateTime &until) = 0;

protected:
  ReplayGuard() = default;
  ReplayGuard(const ReplayGuard &) = default;
  ReplayGuard &operator=(const ReplayGuard &) = default;
  ~ReplayGuard() = default;
};

/// The largest capacity of a guard in memory.
constexpr std::size_t MAX_MEMORY_REPLAY_GUARD_CAPACITY = 100'000'000;

/// A guard in the memory of this process. It remembers at most `capacity` messages, and answers UNAVAILABLE to more.
/// Messages that have expired are removed gradually, a few in each call. While at most four fifths of `capacity` have
/// not expired, a new message always has a place.
///
/// It uses at most 32 bytes for each message of `capacity` and less than 1 KiB in addition, all of them from the
/// beginning. A call never waits for many messages that expire at once.
///
/// It contains 96 bits of a hash of each identifier, with a secret key. So it never answers FIRST to a message that it
/// knows. It answers REPEATED to a new message with a probability of less than 2 to the power of -69, however senders choose
/// their messages.
///
/// The clock is that of the machine. The guard also answers UNAVAILABLE to a message that it does not know, and
/// remembers nothing, if `until` is not in the future. After the clock was set back, it does the same if `until` is not
/// later than the latest `until` of the messages that it has removed, because the message may be one of them. So of all
/// calls with one identifier and one `until`, only one is ever answered FIRST, even if the clock changes.
///
/// A child made by `fork` gets a copy of the guard. After that, parent and child do not know each other's messages.
/// @throws Tarvel::InvalidArgumentException when `capacity` is 0 or more than `MAX_MEMORY_REPLAY_GUARD_CAPACITY`.
/// @throws std::bad_alloc. @throws std::exception when the machine has no source of random numbers.
SSOCLIENT_API std::shared_ptr<ReplayGuard> CreateMemoryReplayGuard(std::size_t capacity);

} // namespace SsoClient
