// SPDX-License-Identifier: Apache-2.0

#include "client/change_listeners.h"

#include "client/delivery.h"

#include <algorithm>
#include <mutex>
#include <utility>

namespace SsoClient {

ChangeListeners::ChangeListeners(Executor executor) : m_executor(std::move(executor)) {}

std::shared_ptr<void> ChangeListeners::Add(Function function) {
  const auto entry = std::make_shared<Function>(std::move(function));
  const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
  const auto isRemoved = [](const Entry &listed) { return listed.expired(); };
  m_entries.erase(std::remove_if(m_entries.begin(), m_entries.end(), isRemoved), m_entries.end());
  m_entries.push_back(entry);
  return entry;
}

bool ChangeListeners::Queue(const std::shared_ptr<const SamlToken> &token) {
  const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
  for (const Entry &entry : m_entries) {
    if (!m_isClosed && !entry.expired()) {
      m_calls.emplace_back(entry, token);
    }
  }
  return !m_calls.empty() && !std::exchange(m_isRunning, true);
}

/// Called by the thread that has set `m_isRunning`.
void ChangeListeners::ScheduleNext() noexcept {
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    m_isRunning = !m_calls.empty();
    if (!m_isRunning) {
      return;
    }
  }
  try {
    RunOn(m_executor, [self = shared_from_this()] { self->RunNext(); });
  } catch (...) {
    // No memory: the calls are made with those for the next token.
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    m_isRunning = false;
  }
}

/// Makes one call, and schedules the next one even if this call throws.
void ChangeListeners::RunNext() {
  struct Finally {
    ChangeListeners &listeners;
    ~Finally() { listeners.ScheduleNext(); }
  } const finally{*this};
  Call call;
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (m_calls.empty()) {
      return;
    }
    call = std::move(m_calls.front());
    m_calls.pop_front();
  }
  if (const std::shared_ptr<const Function> function = call.first.lock()) {
    (*function)(call.second);
  }
}

void ChangeListeners::Close() noexcept {
  std::list<Call> dropped;
  const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
  dropped.swap(m_calls);
  m_isClosed = true;
}

void ChangeListeners::ForgetCalls() noexcept {
  const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
  m_calls.clear();
  m_isRunning = false;
}

} // namespace SsoClient
