// SPDX-License-Identifier: Apache-2.0
/// @file
/// Changes to documents.

#pragma once

#include "integration/signature_oracle/random_source.h"

#include <string>
#include <string_view>

namespace Testing {

/// One change to `text`: an octet or a bit changed, something removed, repeated, exchanged, inserted, or cut off, or a part of
/// `other` put in.
void Mutate(std::string &text, std::string_view other, RandomSource &random);

} // namespace Testing
