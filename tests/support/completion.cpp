// SPDX-License-Identifier: Apache-2.0

#include "support/completion.h"

#include "system/io_engine.h"

#include <boost/asio/post.hpp>

namespace Testing {

namespace {

/// Waits until each I/O thread has run what was queued on it, and all are idle at the same time.
bool MeetIoThreads() {
  struct Meeting {
    std::mutex mutex;
    std::condition_variable changed;
    std::size_t present = 0;
  };
  const auto meeting = std::make_shared<Meeting>();
  const auto attend = [meeting] {
    std::unique_lock<std::mutex> lock(meeting->mutex);
    ++meeting->present;
    meeting->changed.notify_all();
    return meeting->changed.wait_for(lock, PATIENCE,
                                     [&meeting] { return meeting->present == Tarvel::System::IO_THREADS + 1; });
  };
  for (std::size_t thread = 0; thread < Tarvel::System::IO_THREADS; ++thread) {
    // Twice, because what a handler posts on its own thread is queued only when the handler has returned.
    boost::asio::io_context &context = Tarvel::System::GetIoContextOf(thread);
    boost::asio::post(context, [&context, attend] { boost::asio::post(context, attend); });
  }
  return attend();
}

} // namespace

bool Completion::Wait() const {
  std::unique_lock<std::mutex> lock(m_state->mutex);
  return m_state->called.wait_for(lock, PATIENCE, [this] { return m_state->calls > 0; });
}

int Completion::GetCalls() const {
  const std::lock_guard<std::mutex> lock(m_state->mutex);
  return m_state->calls;
}

std::string Completion::GetMessage() const {
  if (!Wait()) {
    return "(never called)";
  }
  const std::lock_guard<std::mutex> lock(m_state->mutex);
  return m_state->failure ? m_state->failure->what() : "";
}

std::size_t Completion::GetCount() const {
  Wait();
  const std::lock_guard<std::mutex> lock(m_state->mutex);
  return m_state->count;
}

void Completion::State::Note(std::size_t moved, const Tarvel::Exception *exception) {
  const std::lock_guard<std::mutex> lock(mutex);
  ++calls;
  count = moved;
  failure.reset(exception ? exception->Clone() : nullptr);
  called.notify_all();
}

bool Completion::FailedWith(const std::type_info &expected) const {
  Wait();
  const std::lock_guard<std::mutex> lock(m_state->mutex);
  const Tarvel::Exception *const failure = m_state->failure.get();
  return failure && typeid(*failure) == expected;
}

bool DrainIoThreads() {
  // The second meeting is for work that a thread has queued on another one while that one waited at the first.
  return MeetIoThreads() && MeetIoThreads();
}

} // namespace Testing
