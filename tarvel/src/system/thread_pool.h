// SPDX-License-Identifier: Apache-2.0
/// @file
/// Thread pools that are never destroyed.

#pragma once

#include <tarvel/system/thread_pool.h>

namespace Tarvel::System {

/// A pool that lives until the process ends. Its threads are never joined; each is detached when it retires. The caller
/// must never release the reference.
Ref<ThreadPool> CreateEndlessThreadPool(std::size_t threadCeiling, std::chrono::milliseconds idleTime);

} // namespace Tarvel::System
