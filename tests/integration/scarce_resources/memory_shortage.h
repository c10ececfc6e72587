// SPDX-License-Identifier: Apache-2.0
/// @file
/// A lack of memory on the threads of the platform, and in the call that starts an operation.

#pragma once

#include <functional>

namespace Testing {

enum class Shortage { NONE, OF_ONE_PIECE, FROM_ONE_PIECE_ON };

/// Calls `start`, and refuses allocation number `pieces`, counted from 0 in this call and on the platform's threads.
/// The shortage lasts until `EndShortage`. Returns whether `start` threw.
bool StartShortOfMemory(Shortage shortage, int pieces, const std::function<void()> &start);

/// Protects a part of `start`: while this object exists, allocations of its thread succeed.
class EnoughMemory {
public:
  EnoughMemory() noexcept;
  EnoughMemory(const EnoughMemory &) = delete;
  EnoughMemory &operator=(const EnoughMemory &) = delete;
  ~EnoughMemory();
};

/// Returns how many allocations were refused.
int EndShortage();

} // namespace Testing
