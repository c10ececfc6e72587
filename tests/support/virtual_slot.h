// SPDX-License-Identifier: Apache-2.0
/// @file
/// The place of a virtual function in its class's table: programs that were built with an older header rely on it.

#pragma once

#include <array>
#include <cstddef>
#include <cstring>

namespace Testing {

/// The place of `function` in the table, counted from 1; 0 for a function that is not virtual. Reads the pointer as
/// g++ and clang represent it, by the Itanium C++ ABI.
template <typename Function>
std::ptrdiff_t SlotOf(Function function) {
  std::array<std::ptrdiff_t, 2> parts{}; // offset or address, and adjustment of the object's address
  static_assert(sizeof function == sizeof parts);
  std::memcpy(parts.data(), &function, sizeof parts);
#if defined(__aarch64__) || defined(__arm__)
  const bool isVirtual = (parts[1] & 1) != 0;
  const std::ptrdiff_t offset = parts[0];
#else
  const bool isVirtual = (parts[0] & 1) != 0;
  const std::ptrdiff_t offset = parts[0] - 1;
#endif
  return isVirtual ? offset / static_cast<std::ptrdiff_t>(sizeof(void *)) + 1 : 0;
}

} // namespace Testing
