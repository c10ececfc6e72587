// SPDX-License-Identifier: Apache-2.0
/// @file
/// What every report promises, checked without the library's own rules.

#pragma once

#include "support/judged_token.h"

#include <string>

namespace Testing {

/// How `report` breaks promises of token_report.h or contradicts `verification`, one contradiction on each line; empty
/// if there is none. The clock must still show the time of the verification.
std::string FindContradictions(const SsoClient::TokenReport &report, const Verification &verification,
                               const JudgedVerifier &verifier);

} // namespace Testing
