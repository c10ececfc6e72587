// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenReport`, what the tool tells of one token, and its written forms.

#pragma once

#include "output.h"
#include "token/token_facts.h"
#include "unmet_request.h"

#include <ssoclient/saml_token.h>

#include <boost/optional.hpp>

#include <string>
#include <vector>

namespace SsoClient::Tool {

/// The facts of a token that was not verified are claims of whoever wrote it.
struct TokenReport {
  bool verified = false;
  TokenFacts facts;
  std::string xml;
  /// What was asked for and is not in the token; nothing for a token that was not asked for just now.
  boost::optional<std::vector<UnmetRequest>> unmet;
};

/// The report of a verified token.
TokenReport ReportOf(const SamlToken &token);

/// The report of the assertion in `xml`, which is read as strictly as for verifying; but its dates, its consistency and
/// its signature are not checked.
/// @throws Tarvel::Xml::XMLParseException when `xml` is not a well-formed document.
/// @throws ParseException when it is not an assertion of the accepted form.
TokenReport InspectToken(std::string xml);

/// `report` in `format`, ending in a line end: lines for a person, one JSON object, or the token's XML as it came.
std::string Render(const TokenReport &report, Format format);

} // namespace SsoClient::Tool
