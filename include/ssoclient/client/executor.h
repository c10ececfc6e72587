// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Executor`, which decides on which thread a callback runs.

#pragma once

#include <functional>

namespace SsoClient {

/// Any callable that runs a function once, now or later, on a thread of its choice: for example one that posts the function to
/// an event loop. It is called on threads of the library, or on the thread that cancels, so it must be safe on any thread and must not
/// block.
///
/// An executor refuses a function by throwing, or by destroying it without having run it. The function then runs on a
/// thread of the library, because each operation must end with exactly one outcome. What an executor throws is logged.
///
/// An empty executor means the library's own threads (at most four), on which a callback must not block.
using Executor = std::function<void(std::function<void()> function)>;

} // namespace SsoClient
