// SPDX-License-Identifier: Apache-2.0
/// @file
/// Canonical forms written from the events of expat, a parser that shares no code with libxml2's or with ours.

#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace Testing {

struct ExpatMethod {
  bool isExclusive = false;
  bool withComments = false;
  std::vector<std::string> inclusivePrefixes; ///< "#default" is the default namespace
};

constexpr std::size_t NO_ELEMENT = static_cast<std::size_t>(-1);

/// The canonical form (Canonical XML 1.0 or Exclusive XML Canonicalization 1.0) of the subtree at the element number
/// `apex`, without the subtree at the element number `omitted`. Elements are counted from 0 in document order. With
/// `NO_ELEMENT`, `apex` means the whole document, and `omitted` that nothing is omitted. Returns nothing when expat
/// refuses the document or a prefix is not bound.
std::optional<std::string> CanonicalFormByExpat(std::string_view text, std::size_t apex, std::size_t omitted,
                                                const ExpatMethod &method);

} // namespace Testing
