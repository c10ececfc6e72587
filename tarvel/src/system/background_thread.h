// SPDX-License-Identifier: Apache-2.0
/// @file
/// Starts threads with signals blocked, so that the host's handlers run on the host's threads.

#pragma once

#include <functional>
#include <thread>

namespace Tarvel::System {

/// Starts a thread that runs `body`, which must not throw. The thread blocks every signal except those that its own
/// faults raise, such as SIGSEGV.
/// @param name shown by debuggers; at most 15 characters.
/// @throws InvalidStateException when the system cannot start another thread.
std::thread StartBackgroundThread(const char *name, std::function<void()> body);

} // namespace Tarvel::System
