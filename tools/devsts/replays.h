// SPDX-License-Identifier: Apache-2.0
/// @file
/// The messages that were accepted, so that no message is accepted twice.

#pragma once

#include "time_text.h"

#include <cstddef>
#include <mutex>
#include <set>
#include <string>
#include <utility>

namespace DevSts {

/// Any number of threads may use it at once.
class Replays {
public:
  enum class Answer { FIRST, REPEATED, FULL };

  /// Remembers at most `capacity` messages.
  explicit Replays(std::size_t capacity) : m_capacity(capacity) {}

  /// Remembers the message until `until`, and forgets those whose time is before `now`.
  Answer Remember(const std::string &identifier, Time until, Time now);

private:
  const std::size_t m_capacity;
  std::mutex m_mutex;
  std::set<std::string> m_known;                      ///< guarded by the mutex
  std::set<std::pair<Time, std::string>> m_untilTime; ///< the same messages by their time; guarded by the mutex
};

} // namespace DevSts
