// SPDX-License-Identifier: Apache-2.0
/// @file
/// The C++ heap of this program, counted.

#pragma once

#include <cstddef>

namespace Attacks {

/// Counts octets from the heap since its construction: the total allocated, and the most in use at once. Only one
/// object at a time, in a program that allocates on one thread.
class HeapCount {
public:
  HeapCount() noexcept;

  std::size_t GetAllocated() const noexcept;
  std::size_t GetPeak() const noexcept;

private:
  std::size_t m_allocatedBefore;
  std::size_t m_liveBefore;
};

} // namespace Attacks
