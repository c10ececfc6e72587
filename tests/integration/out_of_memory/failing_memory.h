// SPDX-License-Identifier: Apache-2.0
/// @file
/// Memory for OpenSSL that runs out when a test says so.

#pragma once

namespace Testing {

enum class Shortage {
  ONCE,      ///< one allocation fails, and the next finds memory again
  FROM_THEN, ///< and so do all that follow
};

/// While it lives, the `number`th allocation from now on, counted from 1, fails, whatever thread makes it.
class FailingMemory {
public:
  FailingMemory(int number, Shortage shortage);
  FailingMemory(const FailingMemory &) = delete;
  FailingMemory &operator=(const FailingMemory &) = delete;
  ~FailingMemory();

  /// Whether an allocation has failed.
  bool HasFailed() const noexcept;
};

/// Allocations of OpenSSL that have not been given back.
long CountForeignAllocations();

} // namespace Testing
