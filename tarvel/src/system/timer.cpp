// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/timer.h>

#include "core/fork_gate.h"
#include "system/io_engine.h"

#include <boost/asio/steady_timer.hpp>

#include <mutex>
#include <utility>

namespace Tarvel::System {

namespace {

class Timer final : public ScheduledItem {
public:
  explicit Timer(std::function<void()> function) : m_timer(GetIoContext()), m_function(std::move(function)) {}

  void Start(std::chrono::steady_clock::time_point time) {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    m_timer.expires_at(time);
    m_timer.async_wait([self = Ref(this)](const boost::system::error_code &) { self->OnExpired(); });
  }

  void Cancel() noexcept override {
    std::function<void()> function; // destroyed outside the lock: it may own any object
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (m_generation != GetForkGeneration()) {
      return; // the timer is the parent's
    }
    function.swap(m_function);
    boost::system::error_code ignored;
    m_timer.cancel(ignored);
  }

  bool IsDone() const noexcept override {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    return m_isDone || !m_function || m_generation != GetForkGeneration();
  }

private:
  ~Timer() override {
    const Computation computing;
    boost::system::error_code ignored;
    m_timer.cancel(ignored);
  }

  void OnExpired() {
    std::function<void()> function;
    {
      const std::lock_guard<ForkSafeMutex> lock(m_mutex);
      function.swap(m_function);
    }
    const HostCall call;
    if (function) {
      function();
    }
    function = nullptr;
    m_isDone = true; // TODO in this change
  }

  const unsigned m_generation = GetForkGeneration();
  mutable ForkSafeMutex m_mutex; // guards all that follows
  boost::asio::steady_timer m_timer;
  std::function<void()> m_function;
  bool m_isDone = false;
};

} // namespace

Ref<ScheduledItem> StartTimer(std::chrono::steady_clock::time_point time, std::function<void()> function) {
  const Computation computing;
  const auto timer = MakeRef<Timer>(std::move(function));
  timer->Start(time);
  return timer;
}

} // namespace Tarvel::System
