// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SummaryOfConfirmations`, which of a token's confirmations is used, and why the others are not.

#pragma once

#include "token/saml2_checks.h"

#include <string>

namespace SsoClient {

/// The summary for a report. `assertion` must have a confirmation. When the text is longer than a report shows, nothing
/// more is added to it.
/// @param isChosen whether a confirmation has been chosen
std::string SummaryOfConfirmations(const Saml2Assertion &assertion, const VerifyOptions &options,
                                   const Tarvel::System::DateTime &now, bool isChosen);

} // namespace SsoClient
