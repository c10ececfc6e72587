// SPDX-License-Identifier: Apache-2.0
/// @file
/// Whole documents of random choices.

#pragma once

#include "integration/signature_oracle/random_source.h"

#include <string>

namespace Testing {

/// A well-formed document, or one of which some pieces are probably wrong.
std::string WriteDocument(RandomSource &random);

} // namespace Testing
