// SPDX-License-Identifier: Apache-2.0

#include "replays.h"

namespace DevSts {

Replays::Answer Replays::Remember(const std::string &identifier, Time until, Time now) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  while (!m_untilTime.empty() && m_untilTime.begin()->first < now) {
    m_known.erase(m_untilTime.begin()->second);
    m_untilTime.erase(m_untilTime.begin());
  }
  if (m_known.count(identifier) != 0) {
    return Answer::REPEATED;
  }
  if (m_known.size() >= m_capacity) {
    return Answer::FULL;
  }
  m_known.insert(identifier);
  m_untilTime.emplace(until, identifier);
  return Answer::FIRST;
}

} // namespace DevSts
