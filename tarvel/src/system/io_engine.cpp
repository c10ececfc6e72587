// SPDX-License-Identifier: Apache-2.0

#include "system/io_engine.h"

#include "system/background_thread.h"
#include "system/uncaught_exception.h"

#include <tarvel/core/exception.h>

#include <boost/asio/executor_work_guard.hpp>

#include <memory>

namespace Tarvel::System {

namespace {

/// Two, so that one long handshake does not hold up everybody else.
constexpr int IO_THREADS = 2;

class IoEngine {
public:
  IoEngine() {
    StartBackgroundThread("tarvel-io", [this] { Run(); }).detach();
    try {
      for (int started = 1; started < IO_THREADS; ++started) {
        StartBackgroundThread("tarvel-io", [this] { Run(); }).detach();
      }
    } catch (const InvalidStateException &) {
      // One thread does the same work, only later.
    }
  }

  boost::asio::io_context &GetContext() noexcept { return m_context; }

private:
  void Run() noexcept {
    for (;;) {
      try {
        m_context.run();
        return;
      } catch (...) {
        LogUncaughtException("a completion handler");
      }
    }
  }

  boost::asio::io_context m_context{IO_THREADS};
  const boost::asio::executor_work_guard<boost::asio::io_context::executor_type> m_work{m_context.get_executor()};
};

} // namespace

boost::asio::io_context &GetIoContext() {
  // Never destroyed: its threads run past the end of static objects, and nobody waits for them.
  static IoEngine *const engine = new IoEngine;
  return engine->GetContext();
}

} // namespace Tarvel::System
