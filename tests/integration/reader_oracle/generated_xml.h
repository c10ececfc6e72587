// SPDX-License-Identifier: Apache-2.0
/// @file
/// Documents made up from a seed for comparing readers: many are well-formed, most of the others nearly so.

#pragma once

#include <cstdint>
#include <string>

namespace Testing {

/// The same text for the same seed on every machine; at most some KiB, mostly far below.
std::string GenerateXml(std::uint64_t seed);

} // namespace Testing
