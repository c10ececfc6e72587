// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CheckTokenProperties`, the rules that a schema cannot express.

#pragma once

#include "token/assertion_model.h"

#include <cstdint>

namespace SsoClient {

/// Checks version, identifier, validity and delegation of `assertion`.
/// @param clockToleranceSec seconds by which the time of validity is extended at both ends; a negative number shortens it
/// @throws ParseException on the first rule that fails.
void CheckTokenProperties(const SamlAssertionType &assertion, std::int64_t clockToleranceSec);

} // namespace SsoClient
