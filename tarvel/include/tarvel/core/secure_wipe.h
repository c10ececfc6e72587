// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SecureWipe`, which overwrites a secret before its memory is freed.

#pragma once

#include <tarvel/core/export.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace Tarvel {

/// Overwrites `length` bytes at `data` with zeros; no compiler optimises this away. `data` may be null when `length` is 0.
TARVEL_API void SecureWipe(void *data, std::size_t length) noexcept;

/// Overwrites the text and the rest of its memory, in which an earlier, longer value may remain, and makes the text empty.
TARVEL_API void SecureWipe(std::string &text) noexcept;

/// The same for a list of bytes.
TARVEL_API void SecureWipe(std::vector<std::uint8_t> &bytes) noexcept;

} // namespace Tarvel
