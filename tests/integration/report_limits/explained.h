// SPDX-License-Identifier: Apache-2.0
/// @file
/// What a report costs.

#pragma once

#include <ssoclient/token_report.h>

#include <cstddef>
#include <string>

namespace Reports {

struct Explained {
  SsoClient::TokenReport report;
  std::size_t allocated = 0; ///< octets, in total
  std::size_t peak = 0;      ///< the most octets at the same time, without the document's text
};

/// Explains `xml` with a verifier that trusts three keys and demands an audience and a confirmation.
Explained Explain(const std::string &xml);

/// The octets of all texts that are promised to be cut: all except the refusal and the claims.
std::size_t CountTexts(const SsoClient::TokenReport &report);

/// The number of listed findings.
std::size_t CountFindings(const SsoClient::TokenReport &report);

} // namespace Reports
