// SPDX-License-Identifier: Apache-2.0
/// @file
/// Changes to documents.

#pragma once

#include "integration/signature_oracle/random_source.h"

#include <string>
#include <string_view>

namespace Testing {

/// Makes one change to `text`: changes a bit or an octet, inserts an octet, removes, repeats or exchanges a part,
/// inserts a part of `other`, or replaces the end by that of `other` or by nothing.
void Mutate(std::string &text, std::string_view other, RandomSource &random);

} // namespace Testing
