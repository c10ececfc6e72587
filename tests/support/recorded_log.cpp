// SPDX-License-Identifier: Apache-2.0

#include "support/recorded_log.h"

#include <ssoclient/logger.h>
#include <tarvel/service/app.h>

namespace Testing {

RecordedLog::RecordedLog() : m_state(std::make_shared<State>()) {
  Tarvel::Service::GetApp().GetRootLogger()->SetSink([state = m_state](const Tarvel::Service::LogRecord &record) {
    {
      const std::lock_guard<std::mutex> lock(state->mutex);
      state->lines.push_back(std::string(record.logger) + " " + std::to_string(record.level) + " " +
                             std::string(record.message));
      state->threads.insert(std::this_thread::get_id());
    }
    state->written.Add();
  });
}

RecordedLog::~RecordedLog() {
  Tarvel::Service::GetApp().GetRootLogger()->SetSink({});
}

std::vector<std::string> RecordedLog::Lines() const {
  const std::lock_guard<std::mutex> lock(m_state->mutex);
  return m_state->lines;
}

std::set<std::thread::id> RecordedLog::Threads() const {
  const std::lock_guard<std::mutex> lock(m_state->mutex);
  return m_state->threads;
}

ScopedLogLevel::ScopedLogLevel(int level) : m_previous(SsoClient::getLogger().GetLevel()) {
  SsoClient::getLogger().SetLevel(level);
}

ScopedLogLevel::~ScopedLogLevel() {
  SsoClient::getLogger().SetLevel(m_previous);
}

} // namespace Testing
