// SPDX-License-Identifier: Apache-2.0
/// @file
/// Thread pools that are never destroyed.

#pragma once

#include <tarvel/system/thread_pool.h>

namespace Tarvel::System {

constexpr const char *POOL_THREAD_NAME = "tarvel-pool";

/// A pool that lives until the process ends. Its threads are never joined; each is detached when it retires. The caller
/// must never release the reference.
/// @param threadName shown by debuggers and by /proc; at most 15 characters, a literal
Ref<ThreadPool> CreateEndlessThreadPool(std::size_t threadCeiling, std::chrono::milliseconds idleTime,
                                        const char *threadName = POOL_THREAD_NAME);

/// Frees what a library keeps for the calling thread, and returns true; or returns false if that can no longer be
/// freed. It must not block, start work or use the pool.
using ThreadEndHook = bool (*)() noexcept;

/// Makes each idle thread of an endless pool call `hook` before it ends. If `hook` returns false, the thread stays, and
/// asks again after another idle time. Returns the earlier hook; null stands for none.
ThreadEndHook SetThreadEndHook(ThreadEndHook hook) noexcept;

} // namespace Tarvel::System
