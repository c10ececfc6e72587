// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ForkSafeMutex`, for libraries that are built on the platform and must work in a child made by `fork`.

#pragma once

#include <tarvel/core/export.h>

#include <mutex>

namespace Tarvel {

/// A mutex that no child of `fork` finds locked: `fork` on another thread waits until it is released. So lock it only
/// briefly, and release it before you wait for the network, for another thread or for the host's code.
/// `std::condition_variable_any` releases the mutex while it waits.
class TARVEL_API ForkSafeMutex {
public:
  /// Waits for the mutex, and for a fork that is under way.
  void lock();
  /// Releases the mutex. Called by the thread that has locked it.
  void unlock() noexcept;

private:
  std::mutex m_mutex;
};

/// The number of forks between the process that first used the platform and this one. An object that was made when the
/// number was another one belongs to a parent. Its threads do not exist here, and what it shares with the parent must
/// not be touched. Safe on any thread.
TARVEL_API unsigned GetForkGeneration() noexcept;

} // namespace Tarvel
