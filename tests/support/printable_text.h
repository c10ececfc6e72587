// SPDX-License-Identifier: Apache-2.0
/// @file
/// `IsPrintable`, written without the library's own rule, so that tests can check that rule.

#pragma once

#include <string_view>

namespace Testing {

/// Whether `text`, which is UTF-8 except for single octets, has no character that could control a terminal, fake a line or
/// change the direction of text.
bool IsPrintable(std::string_view text);

} // namespace Testing
