// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MedianOf`.

#pragma once

#include <algorithm>
#include <vector>

namespace Bench {

/// The median of the values, of which there must be at least one. For an even number of values, it is the greater one
/// of the two in the middle.
inline double MedianOf(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

} // namespace Bench
