// SPDX-License-Identifier: Apache-2.0
/// @file
/// The heap of C++, which runs out when a test says so.

#pragma once

#include "integration/out_of_memory/failing_memory.h"

namespace Testing {

/// While it lives, `allocations` more of the calling thread succeed, and the next one fails.
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

/// Allocations of all threads that have not been given back.
long CountHeapAllocations() noexcept;

} // namespace Testing
