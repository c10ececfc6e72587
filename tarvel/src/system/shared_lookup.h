// SPDX-License-Identifier: Apache-2.0
/// @file
/// Look-ups of host names that all who ask for the same name at the same time share.

#pragma once

#include "system/name_lookup.h"

#include <tarvel/core/ref.h>
#include <tarvel/system/scheduled_item.h>

#include <exception>
#include <functional>
#include <string>

namespace Tarvel::System {

/// How a look-up ended: with addresses and null, or with none and what the look-up threw.
using LookupCompletion = std::function<void(const AddressList &addresses, const std::exception_ptr &failure)>;

/// Asks for the addresses of `host`. While a look-up of that name runs or waits for its turn, in whatever letter case,
/// this joins it; otherwise it starts one. A result goes to those that wait for it and is then forgotten. One name holds
/// one thread, whoever asks for it, and `MAX_NAME_LOOKUPS` names are looked up at a time.
/// @param completion is called once, on a thread that may be held up only briefly, and must not throw. It is not called
///        once the item is cancelled; one that is being called then runs on.
/// @return the handle to this caller's part. The look-up itself runs on when nobody waits for it any more: the system has
///         no way to interrupt it. One that has not begun then never begins.
/// @throws InvalidStateException when there is no thread and none can be started; `completion` is not called then.
Ref<ScheduledItem> StartSharedLookup(const std::string &host, LookupCompletion completion);

} // namespace Tarvel::System
