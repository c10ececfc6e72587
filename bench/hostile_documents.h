// SPDX-License-Identifier: Apache-2.0
/// @file
/// Documents that are made to cost their reader more than their size would.

#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

namespace Bench {

/// One way to be hostile, in any size.
struct HostileShape {
  std::string name;
  /// Makes a document of about that many octets, and not more.
  std::function<std::string(std::size_t octets)> make;
};

/// All shapes: documents of their own first, then genuine tokens with something put into them.
/// @param token the text of a genuine token, of the form of tests/data/tokens/bearer.xml
std::vector<HostileShape> MakeHostileShapes(const std::string &token);

} // namespace Bench
