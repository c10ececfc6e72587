// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RunOn`, which runs a callback on an executor, exactly once.

#pragma once

#include <ssoclient/client/executor.h>

#include <functional>

namespace SsoClient {

/// Runs `function` once on `executor`. If the executor is empty, throws, or destroys the function without running it,
/// the function runs on a compute thread of the platform. If no such thread can be started, it runs in this call. What
/// `function` or `executor` throws is logged. In a child of the process that called this, the function is not run. The
/// caller holds no lock, because an executor may run the function at once.
/// @param function not empty; released on the thread that has run it
void RunOn(const Executor &executor, std::function<void()> function) noexcept;

} // namespace SsoClient
