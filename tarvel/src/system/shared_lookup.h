// SPDX-License-Identifier: Apache-2.0
/// @file
/// Look-ups of host names that simultaneous callers with the same name share.

#pragma once

#include "system/name_lookup.h"

#include <tarvel/core/ref.h>
#include <tarvel/system/scheduled_item.h>

#include <exception>
#include <functional>
#include <string>

namespace Tarvel::System {

/// Called when a look-up ends: with addresses and null, or with no addresses and the exception that the look-up threw.
using LookupCompletion = std::function<void(const AddressList &addresses, const std::exception_ptr &failure)>;

/// Looks up the addresses of `host`. If a look-up of that name, in any letter case, runs or waits for its turn, this
/// joins it; otherwise it starts one. A result goes to those that wait for it and is not kept. One name occupies one
/// thread, however many callers wait for it, and `MAX_NAME_LOOKUPS` names are looked up at a time.
/// @param completion is called once, on a thread of the look-ups, which it must not block; it must not throw. It is not
///        called once the item is cancelled; a call that has begun by then runs on.
/// @return the handle to this caller's part. A look-up that no caller waits for any more runs on, because the system
///         cannot interrupt it; one that has not begun yet never begins.
/// @throws InvalidStateException when there is no thread and none can be started; `completion` is not called then.
Ref<ScheduledItem> StartSharedLookup(const std::string &host, LookupCompletion completion);

} // namespace Tarvel::System
