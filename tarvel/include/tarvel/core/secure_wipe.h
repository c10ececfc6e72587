// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SecureWipe`, which overwrites a secret before its memory goes back to the heap.

#pragma once

#include <tarvel/core/export.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace Tarvel {

/// Overwrites `length` bytes at `data` with zeros, in a way that no compiler leaves out. `data` may be null when `length`
/// is 0.
TARVEL_API void SecureWipe(void *data, std::size_t length) noexcept;

/// Overwrites the text, and whatever an earlier, longer value left behind it in the same memory, and makes it empty.
TARVEL_API void SecureWipe(std::string &text) noexcept;

/// The same for a list of bytes.
TARVEL_API void SecureWipe(std::vector<std::uint8_t> &bytes) noexcept;

} // namespace Tarvel
