// SPDX-License-Identifier: Apache-2.0
/// @file
/// Comparison of the texts that protocols are written in, where letter case has no meaning.

#pragma once

#include <string_view>

namespace Tarvel {

/// Whether both are equal, letter case of ASCII letters aside.
bool EqualsIgnoringCase(std::string_view left, std::string_view right) noexcept;

} // namespace Tarvel
