// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RecordedLog`, which records every line that is logged while it exists.

#pragma once

#include "support/rendezvous.h"

#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

namespace Testing {

/// Registers itself as the process's only log sink. Lines have the form "LOGGER LEVEL MESSAGE".
class RecordedLog {
public:
  RecordedLog();
  RecordedLog(const RecordedLog &) = delete;
  RecordedLog &operator=(const RecordedLog &) = delete;
  ~RecordedLog();

  std::vector<std::string> Lines() const;

  /// The threads that wrote the lines.
  std::set<std::thread::id> Threads() const;

  bool WaitForLines(int count) const { return m_state->written.WaitFor(count); }

private:
  struct State {
    std::mutex mutex;
    std::vector<std::string> lines;
    std::set<std::thread::id> threads;
    EventCount written;
  };

  const std::shared_ptr<State> m_state;
};

/// Sets the level of the client's logger until the end of the scope.
class ScopedLogLevel {
public:
  explicit ScopedLogLevel(int level);
  ScopedLogLevel(const ScopedLogLevel &) = delete;
  ScopedLogLevel &operator=(const ScopedLogLevel &) = delete;
  ~ScopedLogLevel();

private:
  const int m_previous;
};

} // namespace Testing
