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
  EXPAT = 2,                ///< without namespaces, which rules of this test check
  EXPAT_WITH_NAMESPACES = 4 ///< with its own check of namespaces
};

/// One document, our reading and a peer's that differs, and the readings by libxml2 and by expat without namespaces.
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
  std::string unexplained;        ///< the differences that no rule explains; empty when there are none
};

/// Reads `document` with all readers.
Comparison Compare(std::string_view document);

/// `text` with everything but printable ASCII as \xHH.
std::string Escaped(std::string_view text);

} // namespace Testing
