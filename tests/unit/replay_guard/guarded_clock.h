// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the tests of the replay guard share: a clock that they set, and identifiers.

#pragma once

#include <ssoclient/proof/replay_guard.h>
#include <tarvel/core/environment.h>

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>

namespace ReplayGuardTest {

/// While it exists, it is the clock of the process, in microseconds since 1970. Any thread may use it.
class SetClock {
public:
  explicit SetClock(std::int64_t now) : m_now(std::make_shared<std::atomic<std::int64_t>>(now)) {}

  void Set(std::int64_t now) { *m_now = now; }
  std::int64_t Get() const { return *m_now; }

private:
  std::shared_ptr<std::atomic<std::int64_t>> m_now;
  Tarvel::ScopedEnvironment m_scope{{[now = m_now] { return now->load(); }, {}}};
};

inline Tarvel::System::DateTime At(std::int64_t microseconds) {
  return Tarvel::System::DateTime::FromTimePoint(
      std::chrono::time_point<std::chrono::system_clock, std::chrono::microseconds>(
          std::chrono::microseconds(microseconds)));
}

/// The identifier whose last octets are `number`, and whose others are 0.
inline SsoClient::MessageIdentifier MakeIdentifier(std::uint64_t number) {
  constexpr int BITS_PER_BYTE = 8;
  SsoClient::MessageIdentifier identifier{};
  for (std::size_t i = identifier.size(); number != 0; number >>= BITS_PER_BYTE) {
    identifier[--i] = static_cast<std::uint8_t>(number);
  }
  return identifier;
}

} // namespace ReplayGuardTest
