// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenView`, what the tool shows of a token, and its written forms.

#pragma once

#include "output.h"
#include "report_view.h"
#include "token_facts.h"
#include "unmet_request.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/verify_options.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>
#include <nlohmann/json_fwd.hpp>

#include <string>
#include <string_view>
#include <vector>

namespace SsoClient::Tool {

/// What is shown of a token. If the token was not verified, its facts are mere claims.
struct TokenView {
  bool verified = false;
  boost::optional<TokenFacts> facts; ///< `boost::none` for a token that was refused: what it says is not shown
  std::string xml;
  /// What was asked for and is not in the token; `boost::none` for a token that the service has not just issued.
  boost::optional<std::vector<UnmetRequest>> unmet;
  boost::optional<ReportView> report; ///< `boost::none` if none was asked for
  /// The text shows how far times are from this moment.
  Tarvel::System::DateTime now = Tarvel::System::GetUtcDateTime();
};

/// The view of a verified token.
TokenView ViewOf(const SamlToken &token);

/// The view of the first assertion in `xml`, with a report of how `xml` deviates from the form of `profile`. Nothing in
/// it is verified.
/// @throws Tarvel::Xml::XMLParseException when `xml` is not a well-formed document.
/// @throws ParseException when there is no assertion in it.
TokenView InspectToken(std::string xml, TokenProfile profile = TokenProfile::STRICT);

/// "bearer" or "holder-of-key".
std::string_view ConfirmationText(SamlToken::ConfirmationType confirmation) noexcept;

/// `view` as a JSON object.
nlohmann::ordered_json TokenJsonObject(const TokenView &view);

/// `view` as one JSON object in ASCII.
std::string TokenJson(const TokenView &view);

/// `view` as lines of text.
std::string TokenText(const TokenView &view, const TextStyle &style);

/// `view` in `format` for standard output, ending in a line end: text, JSON, or the token's XML unchanged.
std::string Render(const TokenView &view, Format format);

} // namespace SsoClient::Tool
