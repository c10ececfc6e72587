// SPDX-License-Identifier: Apache-2.0
/// @file
/// The platform's I/O threads: where completions of sockets, streams and timers run.

#pragma once

#include <boost/asio/io_context.hpp>
#include <boost/intrusive/list.hpp>

namespace Tarvel::System {

/// The context that the I/O threads run. The threads start with the first call and live as long as the process. They are
/// shared by everything that is pending, so a handler must never block; what it throws is logged and lost. A child
/// process made by `fork` has a context and threads of its own, which start with its own first call. Whatever is done with
/// the context, its sockets and its timers is done within a `Computation`; its threads are in one already.
/// @throws InvalidStateException when the first thread cannot be started, or there is no descriptor to wait with.
boost::asio::io_context &GetIoContext();

/// An object that holds a descriptor of the I/O threads, and closes it in a child of this process. The constructor and the
/// destructor of the class that derives from it call `Enter` and `Leave`.
class ClosesInChild : public boost::intrusive::list_base_hook<> {
public:
  /// Closes the child's copy of the descriptor. Called in the child, once, where there is no other thread. Nothing is to
  /// be sent, and nobody to be called.
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
