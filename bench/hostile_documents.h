// SPDX-License-Identifier: Apache-2.0
/// @file
/// Documents that are made to cost their reader more than other documents of their size.

#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

namespace Bench {

/// One kind of hostile document, in any size.
struct HostileShape {
  std::string name;
  /// Makes a document of about `octets` octets, but not more.
  std::function<std::string(std::size_t octets)> make;
};

/// All shapes: first complete documents, then genuine tokens with hostile content inserted, then both with as many nodes
/// as the limit allows.
/// @param token the text of a genuine token, of the form of tests/data/tokens/bearer.xml
std::vector<HostileShape> MakeHostileShapes(const std::string &token);

} // namespace Bench
