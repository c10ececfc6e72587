// SPDX-License-Identifier: Apache-2.0
/// @file
/// Comparison of protocol texts in which letter case has no meaning.

#pragma once

#include <string_view>

namespace Tarvel {

/// Whether both are equal, ignoring the case of ASCII letters.
bool EqualsIgnoringCase(std::string_view left, std::string_view right) noexcept;

} // namespace Tarvel
