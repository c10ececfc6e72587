// SPDX-License-Identifier: Apache-2.0
/// @file
/// Waiting, in bounded time, for the one call of a completion handler.

#pragma once

#include "system/io_engine.h"

#include <tarvel/core/exception.h>

#include <boost/asio/post.hpp>

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <memory>
#include <mutex>
#include <string>
#include <typeinfo>

namespace Testing {

/// Far longer than anything here takes, also under a sanitizer on a machine that is busy.
constexpr std::chrono::seconds PATIENCE{60};

/// Makes a handler, and tells how it was called. The handler may outlive this.
class Completion {
public:
  /// For a connect or a handshake.
  auto ForEnd() {
    return [state = m_state](const Tarvel::Exception *failure) { state->Note(0, failure); };
  }
  /// For a read or a write.
  auto ForTransfer() {
    return [state = m_state](std::size_t count, const Tarvel::Exception *failure) { state->Note(count, failure); };
  }

  /// Whether the handler has been called, which is waited for.
  bool Wait() const {
    std::unique_lock<std::mutex> lock(m_state->mutex);
    return m_state->called.wait_for(lock, PATIENCE, [this] { return m_state->calls > 0; });
  }

  int GetCalls() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->calls;
  }

  /// The outcome, once there is one: the message of the exception, "" for none, "(never called)".
  std::string GetMessage() const {
    if (!Wait()) {
      return "(never called)";
    }
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->failure ? m_state->failure->what() : "";
  }

  template <typename Expected>
  bool FailedWith() const {
    Wait();
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    const Tarvel::Exception *const failure = m_state->failure.get();
    return failure && typeid(*failure) == typeid(Expected);
  }

  std::size_t GetCount() const {
    Wait();
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->count;
  }

private:
  struct State {
    void Note(std::size_t moved, const Tarvel::Exception *exception) {
      const std::lock_guard<std::mutex> lock(mutex);
      ++calls;
      count = moved;
      failure.reset(exception ? exception->Clone() : nullptr);
      called.notify_all();
    }

    std::mutex mutex;
    std::condition_variable called;
    int calls = 0;
    std::size_t count = 0;
    std::unique_ptr<const Tarvel::Exception> failure;
  };

  std::shared_ptr<State> m_state = std::make_shared<State>();
};

/// Waits until all that was due on the I/O threads has run: both must be free at the same time.
inline bool DrainIoThreads() {
  struct Meeting {
    std::mutex mutex;
    std::condition_variable changed;
    int present = 0;
  };
  const auto meeting = std::make_shared<Meeting>();
  const auto attend = [meeting] {
    std::unique_lock<std::mutex> lock(meeting->mutex);
    ++meeting->present;
    meeting->changed.notify_all();
    return meeting->changed.wait_for(lock, PATIENCE, [&meeting] { return meeting->present == 3; });
  };
  boost::asio::post(Tarvel::System::GetIoContext(), attend);
  boost::asio::post(Tarvel::System::GetIoContext(), attend);
  return attend();
}

} // namespace Testing
