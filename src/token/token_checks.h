// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CheckTokenProperties`, the rules that a schema cannot express.

#pragma once

#include "token/assertion_model.h"

#include <cstdint>

namespace SsoClient {

/// Judges version, identifier, validity (by the clock, and in itself) and delegation of `assertion`.
/// @param clockToleranceSec seconds by which the validity window is widened on both sides; a negative number narrows it.
/// @throws ParseException on the first rule that fails.
void CheckTokenProperties(const SamlAssertionType &assertion, std::int64_t clockToleranceSec);

} // namespace SsoClient
