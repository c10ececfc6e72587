// SPDX-License-Identifier: Apache-2.0
/// @file
/// Checks the order in which a class declares its virtual functions and its fields: compiled callers rely on it.

#pragma once

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <functional>
#include <vector>

namespace Testing {

/// The index of a virtual function in its class's table. In the Itanium C++ ABI, a pointer to it contains the offset in
/// the table, on some processors with the lowest bit set.
template <typename Function>
std::size_t SlotOf(Function function) {
  std::ptrdiff_t words[2];
  static_assert(sizeof words == sizeof function);
  std::memcpy(words, &function, sizeof words);
  return static_cast<std::size_t>(words[0]) / sizeof(void *);
}

/// Whether the first of `fields` is at the start of `record`, and each of the others after the one before it.
template <typename Record, typename... Fields>
bool AreInOrder(const Record &record, const Fields &...fields) {
  const char *const begin = reinterpret_cast<const char *>(&record);
  const std::vector<std::ptrdiff_t> offsets{(reinterpret_cast<const char *>(&fields) - begin)...};
  return offsets.front() == 0 &&
         std::adjacent_find(offsets.begin(), offsets.end(), std::greater_equal<>()) == offsets.end();
}

} // namespace Testing
