// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenReport`, what the tool shows of a token, and its written forms.

#pragma once

#include "output.h"
#include "token/token_facts.h"
#include "unmet_request.h"

#include <ssoclient/saml_token.h>

#include <boost/optional.hpp>

#include <string>
#include <vector>

namespace SsoClient::Tool {

/// The facts of a token that was not verified are mere claims.
struct TokenReport {
  bool verified = false;
  TokenFacts facts;
  std::string xml;
  /// What was asked for and is not in the token; `boost::none` for a token that the service has not just issued.
  boost::optional<std::vector<UnmetRequest>> unmet;
};

/// The report of a verified token.
TokenReport ReportOf(const SamlToken &token);

/// The report of the assertion in `xml`. Its form is checked as strictly as for verification; its dates, its
/// consistency and its signature are not checked.
/// @throws Tarvel::Xml::XMLParseException when `xml` is not a well-formed document.
/// @throws ParseException when it is not an assertion of the accepted form.
TokenReport InspectToken(std::string xml);

/// `report` in `format`, ending in a line end: lines of text, one JSON object, or the token's XML unchanged.
std::string Render(const TokenReport &report, Format format);

} // namespace SsoClient::Tool
