// SPDX-License-Identifier: Apache-2.0
/// @file
/// Checks the times in a report without the library's arithmetic.

#pragma once

#include <ssoclient/token_report.h>
#include <ssoclient/verify_options.h>

#include <string>

namespace Testing {

/// The mistakes of the report about times, one on each line; empty if there is none. The clock must still show the time
/// of the report.
std::string FindWrongTimes(const SsoClient::TokenReport &report, const SsoClient::VerifyOptions &options);

} // namespace Testing
