// SPDX-License-Identifier: Apache-2.0
/// @file
/// `AppendWiping`, which appends to a secret text.

#pragma once

#include <string>
#include <string_view>

namespace Tarvel {

/// Appends `bytes`, which must not be part of `text`. Memory that the text outgrows is overwritten before it is freed.
void AppendWiping(std::string &text, std::string_view bytes);

} // namespace Tarvel
