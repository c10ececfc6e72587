// SPDX-License-Identifier: Apache-2.0
/// @file
/// How the platform starts its threads: guests in the host's process, whose signals are none of their business.

#pragma once

#include <functional>
#include <thread>

namespace Tarvel::System {

/// Starts a thread that runs `body`, which must not throw. The thread blocks every signal but those that its own faults
/// raise, so that the host's handlers run on the host's threads.
/// @param name shown by debuggers; at most 15 characters.
/// @throws InvalidStateException when the system has no thread left to give.
std::thread StartBackgroundThread(const char *name, std::function<void()> body);

} // namespace Tarvel::System
