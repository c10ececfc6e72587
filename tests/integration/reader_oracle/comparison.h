// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares how the platform's reader and its peers read one document, and knows the intended differences.

#pragma once

#include "reading.h"

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace Testing {

enum class Peer : std::uint8_t {
  LIBXML2 = 1,
  EXPAT = 2,                ///< with the rules of namespaces that this test has written down
  EXPAT_WITH_NAMESPACES = 4 ///< with its own
};

/// One document, our reading and a peer's, which differ, and the readings of all peers.
struct Difference {
  std::string_view document;
  const Reading &ours;
  const Reading &theirs;
  const Reading &libxml2;
  const Reading &expat;
};

/// A kind of intended difference.
struct DifferenceRule {
  const char *name;
  unsigned peers; ///< a sum of `Peer`
  bool (*applies)(const Difference &difference);
};

const std::vector<DifferenceRule> &DifferenceRules();

struct AppliedRule {
  std::size_t rule; ///< its place in `DifferenceRules()`
  Peer peer;
};

struct Comparison {
  Reading ours;
  std::vector<AppliedRule> rules; ///< those that were needed
  std::string unexplained;        ///< a difference that no rule names, or empty
};

/// Reads `document` with all readers.
Comparison Compare(std::string_view document);

/// `text` with everything but printable ASCII as \xHH.
std::string Escaped(std::string_view text);

} // namespace Testing
