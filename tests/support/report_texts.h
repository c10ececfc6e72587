// SPDX-License-Identifier: Apache-2.0
/// @file
/// The texts of a `TokenReport`, and a description of a report. Two reports with the same description have the same
/// content, except that a public key is described only by its length.

#pragma once

#include <ssoclient/token_report.h>

#include <string>
#include <vector>

namespace Testing {

struct ReportText {
  std::string place; ///< such as "FORM, finding 0, message"
  std::string text;
};

/// All texts that a report promises to be printable: all except `refusal` and `claims`.
std::vector<ReportText> PrintableTextsOf(const SsoClient::TokenReport &report);

/// Everything in `report` except the time.
std::string DescribeReport(const SsoClient::TokenReport &report);

/// Everything in `claims`.
std::string DescribeClaims(const SsoClient::UnverifiedClaims &claims);

/// Everything in `details`.
std::string DescribeDetails(const SsoClient::TokenDetails &details);

} // namespace Testing
