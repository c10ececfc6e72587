// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ReportView`, a report as the tool shows it, and its written forms.

#pragma once

#include "terminal_style.h"

#include <ssoclient/token_report.h>

#include <nlohmann/json_fwd.hpp>

#include <string>

namespace SsoClient::Tool {

/// A report, and whether it is about trust, too.
struct ReportView {
  TokenReport report;
  bool usesTrust = true; ///< false: there was no trusted certificate, so nothing can be accepted or refused
};

/// `report`, which was made without trusted certificates, without what it says about their keys.
ReportView WithoutTrust(TokenReport report);

/// All of the report.
nlohmann::ordered_json ReportJson(const ReportView &view);

/// For people: a table of the checks, and lines about the signature's references, the trusted keys, and the named certificates.
/// Without trust, the table lists only what deviates, and is left out if nothing does.
std::string ReportText(const ReportView &view, const TextStyle &style);

} // namespace SsoClient::Tool
