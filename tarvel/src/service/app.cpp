// SPDX-License-Identifier: Apache-2.0

#include <tarvel/service/app.h>

#include "core/fork_gate.h"

#include <memory>
#include <mutex>
#include <utility>

namespace Tarvel::Service {

namespace {

class LogRootImpl final : public LogRoot {
public:
  void SetSink(LogSink sink) override {
    std::shared_ptr<const LogSink> next = sink ? std::make_shared<const LogSink>(std::move(sink)) : nullptr;
    {
      const std::lock_guard<ForkSafeMutex> lock(m_mutex);
      m_hasSink.store(next != nullptr, std::memory_order_relaxed);
      m_sink.swap(next);
    }
    // The earlier sink is destroyed here, outside the lock: its destructor may log.
  }

  void Write(const LogRecord &record) noexcept override {
    if (!HasSink()) {
      return;
    }
    try {
      if (const std::shared_ptr<const LogSink> sink = CurrentSink()) {
        const HostCall call;
        (*sink)(record);
      }
    } catch (...) {
      // A log line that fails must not fail the operation that it reports.
    }
  }

  bool HasSink() const noexcept override { return m_hasSink.load(std::memory_order_relaxed); }

private:
  std::shared_ptr<const LogSink> CurrentSink() const {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    return m_sink;
  }

  mutable ForkSafeMutex m_mutex;
  std::shared_ptr<const LogSink> m_sink;
  std::atomic<bool> m_hasSink{false};
};

class AppImpl final : public App {
public:
  Ref<LogRoot> GetRootLogger() override { return m_root; }

private:
  const Ref<LogRoot> m_root = MakeRef<LogRootImpl>();
};

} // namespace

App &GetApp() {
  const Computation computing;
  // Never destroyed: a thread may log until the process ends, after static objects have been destroyed.
  static AppImpl *const app = new AppImpl;
  return *app;
}

} // namespace Tarvel::Service
