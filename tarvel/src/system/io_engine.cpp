// SPDX-License-Identifier: Apache-2.0

#include "system/io_engine.h"

#include "system/background_thread.h"
#include "system/uncaught_exception.h"

#include <tarvel/core/exception.h>

#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/system/system_error.hpp>

#include <string>

namespace Tarvel::System {

namespace {

/// Two, so that one long handshake does not hold up everybody else.
constexpr int IO_THREADS = 2;

class IoEngine {
public:
  IoEngine() {
    OpenDescriptors();
    StartBackgroundThread("tarvel-io", [this] { Run(); }).detach();
    try {
      for (int started = 1; started < IO_THREADS; ++started) {
        StartBackgroundThread("tarvel-io", [this] { Run(); }).detach();
      }
    } catch (...) {
      // One thread does the same work, only later; and it uses this object already.
    }
  }

  boost::asio::io_context &GetContext() noexcept { return m_context; }

private:
  /// Asio opens what it waits on with the first socket or timer: here, so that no later one can fail for it.
  void OpenDescriptors() {
    try {
      const boost::asio::ip::tcp::socket socket(m_context);
      const boost::asio::steady_timer timer(m_context);
    } catch (const boost::system::system_error &error) {
      throw InvalidStateException("Cannot wait for the network: " + error.code().message());
    }
  }

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
