// SPDX-License-Identifier: Apache-2.0
/// @file
/// Thread pools for the life of the process.

#pragma once

#include <tarvel/system/thread_pool.h>

namespace Tarvel::System {

/// A pool that is never to be destroyed: nobody will ever wait for its threads, so each is let go when it retires. The
/// caller keeps a reference for good.
Ref<ThreadPool> CreateEndlessThreadPool(std::size_t threadCeiling, std::chrono::milliseconds idleTime);

} // namespace Tarvel::System
