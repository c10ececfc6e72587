// SPDX-License-Identifier: Apache-2.0
/// @file
/// Faults of the system's functions for files. The test program replaces these functions.

#pragma once

#include <cstddef>
#include <functional>
#include <limits>

namespace Testing {

/// How the functions behave. An error is a value of `errno`; with 0 the function does not fail.
struct SystemFaults {
  bool interruptsOften = false;                                       ///< every second call fails with EINTR
  std::size_t largestWrite = std::numeric_limits<std::size_t>::max(); ///< in bytes, by one call
  std::size_t space = std::numeric_limits<std::size_t>::max();        ///< in bytes; then `write` fails with ENOSPC
  int readError = 0;
  int lockError = 0;
  int synchronisationError = 0;
  int renameError = 0;
  int truncationError = 0;
  bool dropsModes = false;                    ///< `fchmod` fails with EPERM
  bool skipsSynchronisation = false;          ///< `fsync` does nothing, and succeeds
  bool isOtherUser = false;                   ///< the process seems to have another effective user
  std::function<void()> beforeLock = nullptr; ///< called once, before the next lock
  std::function<void()> beforeRename = nullptr;

  int synchronisedFiles = 0; ///< how many `fsync` has synchronised
  int synchronisedFolders = 0;
};

/// Until the end of the scope, the functions have these faults.
class ScopedFaults {
public:
  explicit ScopedFaults(SystemFaults &faults) noexcept;
  ScopedFaults(const ScopedFaults &) = delete;
  ScopedFaults &operator=(const ScopedFaults &) = delete;
  ~ScopedFaults();
};

} // namespace Testing
