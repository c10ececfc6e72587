// SPDX-License-Identifier: Apache-2.0
/// @file
/// The platform's I/O threads: where completions of sockets, streams and timers run.

#pragma once

#include <boost/asio/io_context.hpp>

namespace Tarvel::System {

/// The context that the I/O threads run. The threads start with the first call and live as long as the process. They are
/// shared by everything that is pending, so a handler must never block; what it throws is logged and lost. A child
/// process made by `fork` has none of these threads: it must not use the network before it executes a program.
/// @throws InvalidStateException when the first thread cannot be started, or no descriptor is left for what it waits on;
///         a later call tries again.
boost::asio::io_context &GetIoContext();

} // namespace Tarvel::System
