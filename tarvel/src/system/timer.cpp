// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/timer.h>

#include "core/fork_gate.h"
#include "service/uncaught_exception.h"
#include "system/io_engine.h"

#include <boost/asio/steady_timer.hpp>
#include <boost/intrusive/set.hpp>

#include <array>
#include <atomic>
#include <cstddef>
#include <mutex>
#include <utility>

namespace Tarvel::System {

namespace {

using TimePoint = std::chrono::steady_clock::time_point;

/// How many functions run one after the other before the I/O thread does other work.
constexpr std::size_t BATCH = 16;

class TimerQueue;

class Timer final : public ScheduledItem, public boost::intrusive::set_base_hook<> {
public:
  Timer(TimerQueue &queue, TimePoint time, std::function<void()> function)
      : m_queue(queue), m_time(time), m_function(std::move(function)) {}

  TimePoint GetTime() const noexcept { return m_time; }

  void Cancel() noexcept override;
  bool IsDone() const noexcept override;

  /// Called once, on an I/O thread, after the timer was removed from the queue.
  void Run() noexcept;

private:
  enum class Stage { WAITING, RUNNING, DONE };

  ~Timer() override = default;

  TimerQueue &m_queue; // never destroyed
  const TimePoint m_time;
  std::function<void()> m_function; // guarded by the queue's mutex
  std::atomic<Stage> m_stage{Stage::WAITING};
};

/// All timers of a process, with one alarm for the earliest. So a timer that is cancelled before its time, like nearly
/// all timers, costs neither a system call nor a switch of threads.
class TimerQueue {
public:
  /// @param ofParent never used; it keeps the timers of the parent process reachable, so that no leak is reported.
  explicit TimerQueue(TimerQueue *ofParent) : m_alarm(GetIoContext()), m_ofParent(ofParent) {}
  TimerQueue(const TimerQueue &) = delete;
  TimerQueue &operator=(const TimerQueue &) = delete;
  ~TimerQueue() = default;

  bool IsOfParent() const noexcept { return m_generation != GetForkGeneration(); }

  ForkSafeMutex &GetMutex() noexcept { return m_mutex; }

  void Add(const Ref<Timer> &timer);
  /// Removes a timer if it is in the queue. Called under the mutex. @return the queue's reference to it.
  Ref<Timer> Remove(Timer &timer) noexcept;

private:
  struct ByTime {
    using type = TimePoint;
    TimePoint operator()(const Timer &timer) const noexcept { return timer.GetTime(); }
  };
  using Batch = std::array<Ref<Timer>, BATCH>;

  void Arm(TimePoint time);
  void OnAlarm(bool isReplaced);
  void TakeDue(Batch &batch) noexcept;

  const unsigned m_generation = GetForkGeneration();
  ForkSafeMutex m_mutex; // guards all that follows and the timers
  boost::intrusive::multiset<Timer, boost::intrusive::key_of_value<ByTime>> m_waiting; // has a reference to each
  boost::asio::steady_timer m_alarm;
  TimePoint m_armedFor = TimePoint::max(); // at most the time of the earliest timer, unless memory has run out
  bool m_isArmed = false;
  [[maybe_unused]] TimerQueue *const m_ofParent;
};

void Timer::Cancel() noexcept {
  Ref<Timer> ofQueue;
  std::function<void()> function; // destroyed outside the lock: it may own any object
  const std::lock_guard<ForkSafeMutex> lock(m_queue.GetMutex());
  if (m_stage == Stage::WAITING) {
    m_stage = Stage::DONE;
    ofQueue = m_queue.Remove(*this);
    function.swap(m_function);
  }
}

bool Timer::IsDone() const noexcept {
  return m_stage == Stage::DONE || m_queue.IsOfParent();
}

void Timer::Run() noexcept {
  std::function<void()> function;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_queue.GetMutex());
    if (m_stage != Stage::WAITING) {
      return;
    }
    m_stage = Stage::RUNNING;
    function.swap(m_function);
  }
  const HostCall call;
  try {
    function();
  } catch (...) {
    Service::LogUncaughtException("the function of a timer");
  }
  function = nullptr;
  m_stage = Stage::DONE;
}

void TimerQueue::Add(const Ref<Timer> &timer) {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (!m_isArmed || timer->GetTime() < m_armedFor) {
    Arm(timer->GetTime());
  }
  m_waiting.insert(*Ref(timer).Detach());
}

Ref<Timer> TimerQueue::Remove(Timer &timer) noexcept {
  Ref<Timer> removed;
  if (timer.is_linked()) {
    m_waiting.erase(m_waiting.iterator_to(timer));
    removed = Ref(&timer);
    timer.Release(); // the queue's reference; `removed` has one of its own
  }
  return removed;
}

/// Replaces an earlier alarm. Called under the mutex.
void TimerQueue::Arm(TimePoint time) {
  m_isArmed = false; // if memory runs out below, `OnAlarm` of the replaced alarm tries again
  m_alarm.expires_at(time);
  m_alarm.async_wait([this](const boost::system::error_code &error) { OnAlarm(static_cast<bool>(error)); });
  m_armedFor = time;
  m_isArmed = true;
}

/// Sets the next alarm before it runs what is due, so that Asio uses the memory of this alarm for the next one.
void TimerQueue::OnAlarm(bool isReplaced) {
  Batch batch;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (isReplaced && m_isArmed) {
      return;
    }
    m_isArmed = false;
    TakeDue(batch);
    if (!m_waiting.empty()) {
      Arm(m_waiting.begin()->GetTime());
    }
  }
  for (Ref<Timer> &timer : batch) {
    if (!timer || IsOfParent()) {
      return; // a function may have forked: its child must not call the others
    }
    timer->Run();
    timer.reset();
  }
}

/// Called under the mutex.
void TimerQueue::TakeDue(Batch &batch) noexcept {
  const TimePoint now = std::chrono::steady_clock::now();
  for (Ref<Timer> &place : batch) {
    if (m_waiting.empty() || m_waiting.begin()->GetTime() > now) {
      return;
    }
    place = Remove(*m_waiting.begin());
  }
}

// Never destroyed: timers may outlive static objects.
std::atomic<TimerQueue *> currentQueue{nullptr};

TimerQueue &GetQueue() {
  TimerQueue *queue = currentQueue.load(std::memory_order_acquire);
  if (queue && !queue->IsOfParent()) {
    return *queue;
  }
  static ForkSafeMutex *const mutex = new ForkSafeMutex;
  const std::lock_guard<ForkSafeMutex> lock(*mutex);
  queue = currentQueue.load();
  if (!queue || queue->IsOfParent()) {
    queue = new TimerQueue(queue);
    currentQueue.store(queue);
  }
  return *queue;
}

} // namespace

Ref<ScheduledItem> StartTimer(TimePoint time, std::function<void()> function) {
  const Computation computing;
  TimerQueue &queue = GetQueue();
  const auto timer = MakeRef<Timer>(queue, time, std::move(function));
  queue.Add(timer);
  return timer;
}

} // namespace Tarvel::System
