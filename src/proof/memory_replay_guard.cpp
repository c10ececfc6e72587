// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/replay_guard.h>

#include "proof/remembered_messages.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/fork_safe_mutex.h>

#include <mutex>
#include <random>
#include <string>

namespace SsoClient {

namespace {

// `std::random_device` reads the processor's or the kernel's source of random numbers.
SipHashKey MakeRandomKey() {
  constexpr int HALF = 32;
  std::random_device device;
  const auto word = [&device] {
    const std::uint64_t high = device();
    return high << HALF | device();
  };
  const std::uint64_t low = word();
  return {low, word()};
}

class MemoryReplayGuard final : public ReplayGuard {
public:
  explicit MemoryReplayGuard(std::size_t capacity) : m_messages(capacity, MakeRandomKey()) {}

  Answer Remember(const MessageIdentifier &identifier, const Tarvel::System::DateTime &until) override {
    const std::int64_t now = Tarvel::System::GetUtcDateTime().GetUtcTime();
    const RememberedMessages::Place place = m_messages.Prepare(identifier);
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    return m_messages.Remember(place, until.GetUtcTime(), now);
  }

private:
  Tarvel::ForkSafeMutex m_mutex;
  RememberedMessages m_messages;
};

} // namespace

std::shared_ptr<ReplayGuard> CreateMemoryReplayGuard(std::size_t capacity) {
  if (capacity == 0 || capacity > MAX_MEMORY_REPLAY_GUARD_CAPACITY) {
    throw Tarvel::InvalidArgumentException("capacity must be from 1 to " +
                                           std::to_string(MAX_MEMORY_REPLAY_GUARD_CAPACITY));
  }
  return std::make_shared<MemoryReplayGuard>(capacity);
}

} // namespace SsoClient
