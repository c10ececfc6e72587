// SPDX-License-Identifier: Apache-2.0
/// @file
/// Checks the times in a report by arithmetic of its own.

#pragma once

#include <ssoclient/token_report.h>
#include <ssoclient/verify_options.h>

#include <string>

namespace Testing {

/// What the report says wrongly about the time of validity, one on each line; empty if nothing is. The clock must still show
/// the time of the report.
std::string FindWrongTimes(const SsoClient::TokenReport &report, const SsoClient::VerifyOptions &options);

} // namespace Testing
