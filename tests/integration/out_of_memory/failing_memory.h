// SPDX-License-Identifier: Apache-2.0
/// @file
/// Memory for OpenSSL that runs out when a test says so.

#pragma once

namespace Testing {

enum class Shortage {
  ONCE,      ///< one allocation fails, later ones succeed
  FROM_THEN, ///< one allocation and all later ones fail
};

/// While it lives, OpenSSL's `number`th allocation fails, counted from 1 on all threads together.
class FailingMemory {
public:
  FailingMemory(int number, Shortage shortage);
  FailingMemory(const FailingMemory &) = delete;
  FailingMemory &operator=(const FailingMemory &) = delete;
  ~FailingMemory();

  /// Whether an allocation has failed.
  bool HasFailed() const noexcept;
};

/// The number of OpenSSL's allocations that have not been freed.
long CountForeignAllocations();

} // namespace Testing
