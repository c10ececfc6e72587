// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ScheduledItem`, work that has been started and may be cancelled.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>

namespace Tarvel::System {

/// A handle to started work: a queued function, a pending connect, a pending HTTP request. Releasing the handle does
/// not stop the work. Safe on any thread.
class TARVEL_API ScheduledItem : public Object {
public:
  /// Asks the work to stop. Work that has not begun will never begin; a pending operation completes soon, with an
  /// exception; work that is done stays done. May be called any number of times. Does not wait.
  virtual void Cancel() noexcept = 0;

  /// Whether the work has ended, in any way. In a child process, work of the parent counts as ended.
  virtual bool IsDone() const noexcept = 0;

protected:
  ~ScheduledItem() override;
};

} // namespace Tarvel::System
