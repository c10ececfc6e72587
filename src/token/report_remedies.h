// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RemedyFor`, what the reader of a report can do about a finding.

#pragma once

#include <ssoclient/token_report.h>

#include <string>

namespace SsoClient {

/// What the reader can do about `finding`, which belongs to `check`. If `check` is one of the signature's checks,
/// `report` must already contain the keys and the named certificates. The text contains names from the report, which
/// are printable.
std::string RemedyFor(const TokenReport &report, TokenReport::Check check, const TokenReport::Finding &finding);

/// What to do about a token that only the profile SAML2 reads.
std::string RemedyForOtherForm();

/// What to do about a document whose document element is not a SAML 2.0 assertion.
/// @param hasSaml2 whether there is such an assertion in it
std::string RemedyForSurroundings(bool hasSaml2);

} // namespace SsoClient
