// SPDX-License-Identifier: Apache-2.0
/// @file
/// The platform's I/O threads: where completions of sockets, streams and timers run.

#pragma once

#include <boost/asio/io_context.hpp>
#include <boost/intrusive/list.hpp>

namespace Tarvel::System {

/// The context that the I/O threads run. The threads start with the first call and run until the process ends. All
/// pending operations share them, so a handler must never block; an exception that it throws is logged and ignored. A
/// child process made by `fork` has its own context and threads, which start with its own first call. Use the context,
/// its sockets and its timers only within a `Computation`; its own threads are in one already.
/// @throws InvalidStateException when the first thread cannot be started, or the process has no descriptor left.
boost::asio::io_context &GetIoContext();

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
