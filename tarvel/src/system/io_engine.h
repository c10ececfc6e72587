// SPDX-License-Identifier: Apache-2.0
/// @file
/// The platform's I/O threads: where completions of sockets, streams and timers run.

#pragma once

#include <boost/asio/io_context.hpp>
#include <boost/intrusive/list.hpp>

#include <atomic>
#include <cstddef>

namespace Tarvel::System {

/// Two, so that one long handshake does not delay everything else.
constexpr std::size_t IO_THREADS = 2;

/// The context of an I/O thread. On an I/O thread, this is its own; on other threads, the one with the fewest sockets.
/// An object with several sockets and timers calls this once, so that one thread runs all of its handlers. The threads
/// start with the first call and run until the process ends. All pending operations share them, so a handler must never
/// block; an exception that it throws is logged and ignored. A child process made by `fork` has its own contexts and
/// threads, which start with its own first call. Use a context, its sockets and its timers only within a `Computation`;
/// the I/O threads are in one already.
/// @throws InvalidStateException when the first thread cannot be started, or the process has no descriptor left.
boost::asio::io_context &GetIoContext();

/// The context of the I/O thread with this number, below `IO_THREADS`. For tests.
/// @throws what `GetIoContext` throws
boost::asio::io_context &GetIoContextOf(std::size_t thread);

/// The context that a socket uses. While this object exists, the context counts that socket.
class SocketContext {
public:
  /// @throws what `GetIoContext` throws
  SocketContext();
  SocketContext(const SocketContext &) = delete;
  SocketContext &operator=(const SocketContext &) = delete;
  ~SocketContext();

  boost::asio::io_context &Get() const noexcept { return *m_context; }

private:
  boost::asio::io_context *m_context;
  std::atomic<int> *m_sockets;
};

/// Base of an object with a descriptor that must be closed in a child of this process. The constructor of the derived
/// class calls `Enter`, its destructor `Leave`.
class ClosesInChild : public boost::intrusive::list_base_hook<> {
public:
  /// Closes the child's copy of the descriptor. Called once in the child, where there is no other thread. Must not send
  /// anything, nor call a handler.
  virtual void CloseInChild() noexcept = 0;

protected:
  ClosesInChild() = default;
  ClosesInChild(const ClosesInChild &) = delete;
  ClosesInChild &operator=(const ClosesInChild &) = delete;
  ~ClosesInChild() = default;

  void Enter();
  void Leave() noexcept;
};

} // namespace Tarvel::System
