// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RecordedLog`, every line that is logged while it lives.

#pragma once

#include "support/rendezvous.h"

#include <ssoclient/logger.h>
#include <tarvel/service/app.h>

#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

namespace Testing {

/// Takes the process's one log sink. Lines have the form "LOGGER LEVEL MESSAGE".
class RecordedLog {
public:
  RecordedLog() {
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
  RecordedLog(const RecordedLog &) = delete;
  RecordedLog &operator=(const RecordedLog &) = delete;
  ~RecordedLog() { Tarvel::Service::GetApp().GetRootLogger()->SetSink({}); }

  std::vector<std::string> Lines() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->lines;
  }

  /// The threads that wrote the lines.
  std::set<std::thread::id> Threads() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->threads;
  }

  bool WaitForLines(int count) const { return m_state->written.WaitFor(count); }

private:
  struct State {
    std::mutex mutex;
    std::vector<std::string> lines;
    std::set<std::thread::id> threads;
    EventCount written;
  };

  const std::shared_ptr<State> m_state = std::make_shared<State>();
};

/// The level of the client's logger, until the end of the scope.
class ScopedLogLevel {
public:
  explicit ScopedLogLevel(int level) : m_previous(SsoClient::getLogger().GetLevel()) {
    SsoClient::getLogger().SetLevel(level);
  }
  ScopedLogLevel(const ScopedLogLevel &) = delete;
  ScopedLogLevel &operator=(const ScopedLogLevel &) = delete;
  ~ScopedLogLevel() { SsoClient::getLogger().SetLevel(m_previous); }

private:
  const int m_previous;
};

} // namespace Testing
