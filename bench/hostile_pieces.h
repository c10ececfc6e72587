// SPDX-License-Identifier: Apache-2.0
/// @file
/// The pieces that hostile documents repeat.

#pragma once

#include <cstddef>
#include <functional>
#include <string>

namespace Bench {

inline constexpr std::size_t MANY = 250;  // just below the limit of 256: for attributes, declarations in scope, depth
inline constexpr std::size_t LONG = 4000; // just below the limit of 4,096 octets

/// The `index`th piece of a document.
using Piece = std::function<std::string(std::size_t index)>;

Piece Always(std::string text);

/// A short name, a different one for each index.
std::string Name(std::size_t index);

/// The first `count` pieces.
std::string Repeat(std::size_t count, const Piece &piece);

/// Returns `piece` with its `~` replaced by enough blanks that a document of 16 MiB has just fewer nodes and attributes
/// than the limit. One piece has `nodes` nodes and attributes.
Piece Thin(std::string piece, std::size_t nodes);

/// One of the prefixes that the 32-bit hash FNV-1a, with its halves combined, puts into the first of 128 buckets.
std::string CollidingPrefix(std::size_t index);

/// Makes ` xmlns:NAME="URI"`, both from the index.
Piece Declaring(const Piece &prefix, const Piece &uri);

} // namespace Bench
