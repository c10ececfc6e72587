// SPDX-License-Identifier: Apache-2.0
/// @file
/// Documents generated from a seed, to compare readers: many are well-formed, and most of the others nearly are.

#pragma once

#include <cstdint>
#include <string>

namespace Testing {

/// The same text for the same seed with the same compiler; at most a few KiB, mostly much less.
std::string GenerateXml(std::uint64_t seed);

} // namespace Testing
