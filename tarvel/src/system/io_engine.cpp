// SPDX-License-Identifier: Apache-2.0

#include "system/io_engine.h"

#include "core/fork_gate.h"
#include "service/uncaught_exception.h"
#include "system/background_thread.h"

#include <tarvel/core/exception.h>

#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/system/system_error.hpp>

#include <atomic>
#include <memory>
#include <mutex>
#include <string>

namespace Tarvel::System {

namespace {

/// Two, so that one long handshake does not delay everything else.
constexpr int IO_THREADS = 2;

struct Descriptors {
  ForkSafeMutex mutex;
  boost::intrusive::list<ClosesInChild> open; // guarded by mutex
};

Descriptors &GetDescriptors() {
  const Computation computing;
  static Descriptors *const descriptors = new Descriptors; // never destroyed: sockets may outlive static objects
  return *descriptors;
}

class IoEngine final : public ForkListener {
public:
  /// @throws boost::system::system_error when no descriptor is left.
  IoEngine() {
    // When the first socket and the first timer are made, Asio opens the descriptors that it waits on. Both are made
    // here, so that no later one fails for lack of descriptors.
    const boost::asio::ip::tcp::socket socket(m_context);
    const boost::asio::steady_timer timer(m_context);
  }

  /// @throws InvalidStateException when no thread can be started.
  void Start() {
    StartBackgroundThread("tarvel-io", [this] { Run(); }).detach();
    try {
      for (int started = 1; started < IO_THREADS; ++started) {
        StartBackgroundThread("tarvel-io", [this] { Run(); }).detach();
      }
    } catch (...) {
      // The first thread runs already. It does the same work, only more slowly.
    }
  }

  boost::asio::io_context &GetContext() noexcept { return m_context; }

  // The threads leave the context when their handlers have returned, and then hold no lock of Asio.
  void BeforeFork() noexcept override { m_context.stop(); }
  void AtFork() noexcept override { Notify(boost::asio::execution_context::fork_prepare); }
  void AfterForkInParent() noexcept override {
    Notify(boost::asio::execution_context::fork_parent);
    m_context.restart();
  }
  void AfterForkInChild() noexcept override;

private:
  void Run() noexcept {
    const unsigned generation = GetForkGeneration();
    for (;;) {
      const Computation computing; // waits during a fork
      if (generation != GetForkGeneration()) {
        return; // a handler forked, and this is the thread's copy in the child
      }
      try {
        m_context.run();
      } catch (...) {
        Service::LogUncaughtException("a completion handler");
      }
    }
  }

  void Notify(boost::asio::execution_context::fork_event event) noexcept {
    try {
      m_context.notify_fork(event);
    } catch (const boost::system::system_error &) {
      // No descriptor is left for the child's copy of the context, which the child does not use.
    }
  }

  boost::asio::io_context m_context{IO_THREADS};
  const boost::asio::executor_work_guard<boost::asio::io_context::executor_type> m_work{m_context.get_executor()};
  IoEngine *m_ofParent =
      nullptr; // never used; keeps the objects of the parent's operations reachable, so that no leak is reported
};

std::atomic<IoEngine *> engine{nullptr};
IoEngine *engineOfParent = nullptr; // of the process that this one was forked from

// Asio replaces the child's copies of its own descriptors by new ones, so that closing a socket afterwards does not
// affect the parent's sockets. The handlers stay in the context and never run here: they belong to the parent.
void IoEngine::AfterForkInChild() noexcept {
  Notify(boost::asio::execution_context::fork_child);
  Descriptors &descriptors = GetDescriptors();
  while (!descriptors.open.empty()) {
    ClosesInChild &inherited = descriptors.open.front();
    descriptors.open.pop_front();
    inherited.CloseInChild();
  }
  m_ofParent = engineOfParent;
  engineOfParent = this;
  engine.store(nullptr);
}

ForkSafeMutex &GetStartMutex() {
  const Computation computing;
  static ForkSafeMutex *const mutex = new ForkSafeMutex;
  return *mutex;
}

IoEngine &StartEngine() {
  const std::lock_guard<ForkSafeMutex> lock(GetStartMutex());
  if (IoEngine *const started = engine.load()) {
    return *started;
  }
  try {
    auto fresh = std::make_unique<IoEngine>();
    fresh->Start();
    SetForkListener(fresh.get());
    // Never destroyed: its threads outlive static objects and are never joined.
    engine.store(fresh.get());
    return *fresh.release();
  } catch (const boost::system::system_error &error) {
    throw InvalidStateException(std::string("Cannot wait for the network: ") + error.code().message());
  }
}

} // namespace

boost::asio::io_context &GetIoContext() {
  IoEngine *const started = engine.load(std::memory_order_acquire);
  return (started ? *started : StartEngine()).GetContext();
}

void ClosesInChild::Enter() {
  Descriptors &descriptors = GetDescriptors();
  const std::lock_guard<ForkSafeMutex> lock(descriptors.mutex);
  descriptors.open.push_back(*this);
}

void ClosesInChild::Leave() noexcept {
  Descriptors &descriptors = GetDescriptors();
  const std::lock_guard<ForkSafeMutex> lock(descriptors.mutex);
  if (!is_linked()) {
    return; // closed in this child
  }
  descriptors.open.erase(descriptors.open.iterator_to(*this));
}

} // namespace Tarvel::System
