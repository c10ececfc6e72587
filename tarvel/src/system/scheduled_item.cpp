// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/scheduled_item.h>

namespace Tarvel::System {

ScheduledItem::~ScheduledItem() = default;

} // namespace Tarvel::System
