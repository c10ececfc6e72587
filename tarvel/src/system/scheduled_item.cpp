// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/scheduled_item.h>

namespace Tarvel {
namespace System {

ScheduledItem::~ScheduledItem() = default;

} // namespace System
} // namespace Tarvel
