// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ReportView`, a report as the tool shows it, and its written forms.

#pragma once

#include "terminal_style.h"

#include <ssoclient/token_report.h>

#include <nlohmann/json_fwd.hpp>

#include <string>

namespace SsoClient::Tool {

/// A report, and whether it includes the checks of trust.
struct ReportView {
  TokenReport report;
  bool usesTrust = true; ///< false: there was no trusted certificate, so the token is neither accepted nor refused
};

/// The view of `report`, which was made without trusted certificates: the checks of the keys and of the signature
/// become "not done".
ReportView WithoutTrust(TokenReport report);

/// One deviation as JSON.
nlohmann::ordered_json FindingJson(const TokenReport::Finding &finding);

/// The whole report as JSON.
nlohmann::ordered_json ReportJson(const ReportView &view);

/// The report for people: lines about the claims, the signature's references, the trusted keys and the named
/// certificates, and a table of the checks. Without trust, the table has only the checks that did not pass, and is left
/// out if there are none.
std::string ReportText(const ReportView &view, const TextStyle &style);

} // namespace SsoClient::Tool
