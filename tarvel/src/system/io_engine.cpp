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

#include <algorithm>
#include <array>
#include <atomic>
#include <cstddef>
#include <memory>
#include <mutex>
#include <string>

namespace Tarvel::System {

namespace {

struct Descriptors {
  ForkSafeMutex mutex;
  boost::intrusive::list<ClosesInChild> open; // guarded by mutex
};

Descriptors &GetDescriptors() {
  const Computation computing;
  static Descriptors *const descriptors = new Descriptors; // never destroyed: sockets may outlive static objects
  return *descriptors;
}

/// The context of one I/O thread. If two threads shared a context, Asio would wake the second one at each event, so
/// that it waits for the next event while the first thread handles this one. For a single request, waking it takes
/// longer than handling the event.
struct ThreadContext {
  /// @throws boost::system::system_error when no descriptor is left.
  ThreadContext() {
    // When the first socket and the first timer are made, Asio opens the descriptors that it waits on. Both are made
    // here, so that no later one fails for lack of descriptors.
    const boost::asio::ip::tcp::socket socket(context);
    const boost::asio::steady_timer timer(context);
  }

  boost::asio::io_context context{1}; // one thread
  const boost::asio::executor_work_guard<boost::asio::io_context::executor_type> work{context.get_executor()};
  std::atomic<int> sockets{0};
};

class IoEngine;

/// What the calling thread runs, if it is an I/O thread.
struct Running {
  IoEngine *engine = nullptr;
  ThreadContext *context = nullptr;
};
thread_local Running running;

class IoEngine final : public ForkListener {
public:
  /// @throws InvalidStateException when no thread can be started.
  void Start() {
    StartThread();
    try {
      while (m_started < IO_THREADS) {
        StartThread();
      }
    } catch (...) {
      // The first thread runs already. It does all the work, only more slowly.
    }
  }

  /// The calling thread's own context; on other threads, the one with the fewest sockets.
  ThreadContext &GetContext() noexcept {
    if (running.engine == this) {
      return *running.context;
    }
    return *std::min_element(
        m_contexts.begin(), m_contexts.begin() + m_started, [](const ThreadContext &left, const ThreadContext &right) {
          return left.sockets.load(std::memory_order_relaxed) < right.sockets.load(std::memory_order_relaxed);
        });
  }

  boost::asio::io_context &GetContextOf(std::size_t thread) noexcept { return m_contexts[thread].context; }

  // The threads leave their contexts when their handlers have returned, and then hold no lock of Asio.
  void BeforeFork() noexcept override {
    for (ThreadContext &own : m_contexts) {
      own.context.stop();
    }
  }
  void AtFork() noexcept override { Notify(boost::asio::execution_context::fork_prepare); }
  void AfterForkInParent() noexcept override {
    Notify(boost::asio::execution_context::fork_parent);
    for (ThreadContext &own : m_contexts) {
      own.context.restart();
    }
  }
  void AfterForkInChild() noexcept override;

private:
  void StartThread() {
    StartBackgroundThread("tarvel-io", [this, own = &m_contexts[m_started]] { Run(*own); }).detach();
    ++m_started;
  }

  void Run(ThreadContext &own) noexcept {
    running = {this, &own};
    const unsigned generation = GetForkGeneration();
    for (;;) {
      const Computation computing; // waits during a fork
      if (generation != GetForkGeneration()) {
        return; // a handler forked, and this is the thread's copy in the child
      }
      try {
        own.context.run();
      } catch (...) {
        Service::LogUncaughtException("a completion handler");
      }
    }
  }

  void Notify(boost::asio::execution_context::fork_event event) noexcept {
    for (ThreadContext &own : m_contexts) {
      try {
        own.context.notify_fork(event);
      } catch (const boost::system::system_error &) {
        // No descriptor is left for the child's copy of the context, which the child does not use.
      }
    }
  }

  std::array<ThreadContext, IO_THREADS> m_contexts;
  std::size_t m_started = 0; // the first `m_started` contexts have a thread
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

IoEngine &GetEngine() {
  IoEngine *const started = engine.load(std::memory_order_acquire);
  return started ? *started : StartEngine();
}

} // namespace

boost::asio::io_context &GetIoContext() {
  return GetEngine().GetContext().context;
}

boost::asio::io_context &GetIoContextOf(std::size_t thread) {
  return GetEngine().GetContextOf(thread);
}

SocketContext::SocketContext() {
  ThreadContext &chosen = GetEngine().GetContext();
  m_context = &chosen.context;
  m_sockets = &chosen.sockets;
  m_sockets->fetch_add(1, std::memory_order_relaxed);
}

SocketContext::~SocketContext() {
  m_sockets->fetch_sub(1, std::memory_order_relaxed);
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
