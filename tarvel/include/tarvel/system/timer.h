// SPDX-License-Identifier: Apache-2.0
/// @file
/// Timers, each of which runs a function at a given time.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/system/scheduled_item.h>

#include <chrono>
#include <functional>

namespace Tarvel::System {

/// Calls `function` once at `time` or soon after, on an I/O thread, where it must neither block nor wait for another
/// operation. A time in the past means at once, but never within `StartTimer`. Cancelling the returned item prevents
/// the call if it has not begun, and soon releases what the function captures. An exception that the function throws is
/// logged (logger "Tarvel", level 8). In a child that `fork` makes, the function of a timer of the parent is never
/// called, and the item counts as done.
/// @throws InvalidStateException when there is no I/O thread and none can be started; `std::bad_alloc`. `function` is
///         not called then.
TARVEL_API Ref<ScheduledItem> StartTimer(std::chrono::steady_clock::time_point time, std::function<void()> function);

} // namespace Tarvel::System
