// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenFacts`, what a token says.

#pragma once

#include <ssoclient/advice.h>
#include <ssoclient/delegate.h>
#include <ssoclient/principal_id.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/token_details.h>
#include <ssoclient/token_report.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>

#include <set>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient::Tool {

/// The certificate of a holder-of-key token.
struct CertificateFacts {
  std::string subject;
  std::string sha256; ///< the thumbprint
};

/// What a token says. An empty optional means that the token does not say it, or not in a form that can be read. For a
/// verified token, no optional is empty, except `certificate` if its confirmation has none.
struct TokenFacts {
  boost::optional<std::string> id;
  boost::optional<PrincipalId> subject;
  boost::optional<std::pair<std::string, std::string>> fullName; ///< first name and last name
  std::vector<PrincipalId> groups;
  std::vector<Delegate> delegationChain;

  boost::optional<SamlToken::ConfirmationType> confirmation;
  boost::optional<CertificateFacts> certificate;

  boost::optional<Tarvel::System::DateTime> startDate;
  boost::optional<Tarvel::System::DateTime> endDate;
  std::set<std::string> audience;
  std::vector<Advice> advice;

  boost::optional<bool> renewable;
  boost::optional<bool> delegable;
  boost::optional<bool> solution;

  boost::optional<TokenDetails> details;
};

/// The facts of a verified token.
TokenFacts FactsOf(const SamlToken &token);

/// The facts of a token that was not verified: mere claims.
TokenFacts FactsOf(const UnverifiedClaims &claims);

} // namespace SsoClient::Tool
