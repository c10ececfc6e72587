// SPDX-License-Identifier: Apache-2.0
/// @file
/// A heap for C++ that runs out of memory when a test says so.

#pragma once

#include "integration/out_of_memory/failing_memory.h"

namespace Testing {

/// While it lives, the next `allocations` allocations of the calling thread succeed, and the one after them fails.
class FailingHeap {
public:
  FailingHeap(long allocations, Shortage shortage) noexcept;
  FailingHeap(const FailingHeap &) = delete;
  FailingHeap &operator=(const FailingHeap &) = delete;
  ~FailingHeap();

  /// From now on, all allocations succeed.
  void End() noexcept;

  /// Whether an allocation has failed.
  bool HasFailed() const noexcept;
};

/// The number of allocations of the calling thread, minus how many it has freed.
long CountHeapAllocations() noexcept;

} // namespace Testing
