// SPDX-License-Identifier: Apache-2.0
/// @file
/// Look-ups of host names, each shared by all callers that wait for the same name.

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
/// call joins it; otherwise this call starts one. All callers that wait get the result, which is not kept. One name
/// occupies one thread, however many callers wait for it, and at most `MAX_NAME_LOOKUPS` names are looked up at a time.
/// @param completion is called once, on a thread of the look-ups, which it must not block; it must not throw. It is not
///        called after the item is cancelled; a call that has begun by then continues.
/// @return the handle to this caller's part. A look-up that no caller waits for any more continues, because the
///         system cannot interrupt it; one that has not begun yet never begins.
/// @throws InvalidStateException when there is no thread and none can be started; `completion` is not called then.
Ref<ScheduledItem> StartSharedLookup(const std::string &host, LookupCompletion completion);

} // namespace Tarvel::System
