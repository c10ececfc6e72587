// SPDX-License-Identifier: Apache-2.0
/// @file
/// Waiting, in bounded time, for the one call of a completion handler.

#pragma once

#include <tarvel/core/exception.h>

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <memory>
#include <mutex>
#include <string>
#include <typeinfo>

namespace Testing {

/// Far longer than anything here takes, even under a sanitizer on a busy machine.
constexpr std::chrono::seconds PATIENCE{60};

/// Makes a handler, and reports how it was called. The handler may outlive this object.
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

  /// Waits for the handler's call; false when it was not called in time.
  bool Wait() const;

  int GetCalls() const;

  /// Waits for the handler's call, and returns the message of its exception: "" for none, "(never called)" when it was
  /// not called in time.
  std::string GetMessage() const;

  template <typename Expected>
  bool FailedWith() const {
    return FailedWith(typeid(Expected));
  }

  std::size_t GetCount() const;

private:
  struct State {
    void Note(std::size_t moved, const Tarvel::Exception *exception);

    std::mutex mutex;
    std::condition_variable called;
    int calls = 0;
    std::size_t count = 0;
    std::unique_ptr<const Tarvel::Exception> failure;
  };

  bool FailedWith(const std::type_info &expected) const;

  std::shared_ptr<State> m_state = std::make_shared<State>();
};

/// Waits until everything queued on the I/O threads has run: both must be idle at the same time.
bool DrainIoThreads();

} // namespace Testing
